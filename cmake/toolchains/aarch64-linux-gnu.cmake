# 64-bit ARM (Debian arm64). Usage: cmake -DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/aarch64-linux-gnu.cmake
set(MAPCORE_CROSS_TRIPLET aarch64-linux-gnu)
set(MAPCORE_CROSS_PROCESSOR aarch64)
set(MAPCORE_CROSS_QEMU qemu-aarch64)
include(${CMAKE_CURRENT_LIST_DIR}/DebianMultiarch.cmake)
