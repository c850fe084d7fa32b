# 32-bit ARM, hard float (Debian armhf). Usage: cmake -DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/arm-linux-gnueabihf.cmake
set(MAPCORE_CROSS_TRIPLET arm-linux-gnueabihf)
set(MAPCORE_CROSS_PROCESSOR armv7l)
set(MAPCORE_CROSS_QEMU qemu-arm)
include(${CMAKE_CURRENT_LIST_DIR}/DebianMultiarch.cmake)
