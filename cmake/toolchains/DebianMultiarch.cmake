# Cross-compiling for a Debian multiarch triplet: the cross toolchain of
# crossbuild-essential-<arch>, the target's libraries from the multiarch -dev
# packages installed beside the host's (scripts/install-cross-deps.sh), and
# qemu user-mode emulation to run what is built (tests, test discovery).
# Included by the per-triplet files, which set MAPCORE_CROSS_TRIPLET,
# MAPCORE_CROSS_PROCESSOR and MAPCORE_CROSS_QEMU.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR ${MAPCORE_CROSS_PROCESSOR})
set(CMAKE_LIBRARY_ARCHITECTURE ${MAPCORE_CROSS_TRIPLET})
set(CMAKE_C_COMPILER ${MAPCORE_CROSS_TRIPLET}-gcc)
set(CMAKE_CXX_COMPILER ${MAPCORE_CROSS_TRIPLET}-g++)

# Multiarch keeps every architecture under the one root, so there is no
# sysroot: headers are in /usr/include, the target's libraries and package
# configurations in /usr/lib/<triplet>, which CMake searches by the library
# architecture. Programs found (protoc, python3) are the host's.

# pkg-config must only see the target's .pc files, never the host's.
set(ENV{PKG_CONFIG_LIBDIR} "/usr/lib/${MAPCORE_CROSS_TRIPLET}/pkgconfig:/usr/share/pkgconfig")
# Packages that are not multiarch, unpacked into a prefix of their own.
set(ENV{PKG_CONFIG_PATH} "/opt/mapcore-cross/${MAPCORE_CROSS_TRIPLET}/usr/lib/${MAPCORE_CROSS_TRIPLET}/pkgconfig")

# MAPCORE_EMULATOR tells a test that it runs under emulation, so that what
# the emulator cannot do is skipped with its reason, never guessed at.
find_program(MAPCORE_CROSS_QEMU_PROGRAM ${MAPCORE_CROSS_QEMU} REQUIRED)
set(CMAKE_CROSSCOMPILING_EMULATOR env MAPCORE_EMULATOR=${MAPCORE_CROSS_QEMU} ${MAPCORE_CROSS_QEMU_PROGRAM})
