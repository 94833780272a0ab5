# Cross build for the 32-bit ARM target (Debian armhf multiarch); tests run under qemu-arm.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR arm)

set(CMAKE_C_COMPILER arm-linux-gnueabihf-gcc)
set(CMAKE_CXX_COMPILER arm-linux-gnueabihf-g++)
set(CMAKE_LIBRARY_ARCHITECTURE arm-linux-gnueabihf)

set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
# Programs run against the armhf multiarch C library (libc6:armhf) through its own loader.
# The cross toolchain's copy under /usr/arm-linux-gnueabihf is a different glibc build
# than the multiarch libraries the programs also load, and with that mix every
# pthread_create crashes.
set(CMAKE_CROSSCOMPILING_EMULATOR "qemu-arm;-L;/")
set(ENV{PKG_CONFIG_LIBDIR} "/usr/lib/arm-linux-gnueabihf/pkgconfig:/usr/share/pkgconfig")
