# Cross-compiling for 64-bit ARM with Debian's compiler, against the packages unpacked below
# VEXG_SYSROOT (of the environment), and running what was built in an emulator. scripts/cross uses it.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR aarch64)
set(CMAKE_LIBRARY_ARCHITECTURE aarch64-linux-gnu)
set(CMAKE_CXX_COMPILER aarch64-linux-gnu-g++)
set(CMAKE_SYSROOT $ENV{VEXG_SYSROOT})
set(CMAKE_CROSSCOMPILING_EMULATOR qemu-aarch64 -L $ENV{VEXG_SYSROOT})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)
# Libraries that libraries need.
add_link_options(-Wl,-rpath-link,$ENV{VEXG_SYSROOT}/usr/lib/aarch64-linux-gnu
                 -Wl,-rpath-link,$ENV{VEXG_SYSROOT}/lib/aarch64-linux-gnu)
set(ENV{PKG_CONFIG_SYSROOT_DIR} $ENV{VEXG_SYSROOT})
set(ENV{PKG_CONFIG_LIBDIR} $ENV{VEXG_SYSROOT}/usr/lib/aarch64-linux-gnu/pkgconfig:$ENV{VEXG_SYSROOT}/usr/share/pkgconfig)
