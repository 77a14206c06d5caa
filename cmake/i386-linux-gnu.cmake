# The target's word size on the 64-bit build machine: gcc -m32 against
# Debian's i386 multiarch libraries (libtrio-dev:i386, libgtest-dev:i386, ...),
# which scripts/install-deps installs. The programs run here as they are.
set(CMAKE_C_FLAGS_INIT -m32)
set(CMAKE_CXX_FLAGS_INIT -m32)
set(CMAKE_EXE_LINKER_FLAGS_INIT -m32)
set(CMAKE_SHARED_LINKER_FLAGS_INIT -m32)
set(CMAKE_MODULE_LINKER_FLAGS_INIT -m32)
# Searches lib/i386-linux-gnu, never the 64-bit libraries beside it.
set(CMAKE_LIBRARY_ARCHITECTURE i386-linux-gnu)
# pkg-config too: only the i386 .pc files and the architecture-free ones, so
# an optional package that the machine has for amd64 alone (libedit-dev, for
# the shell's line editing) is not found, rather than found and failing to link.
set(ENV{PKG_CONFIG_LIBDIR}
    "/usr/local/lib/i386-linux-gnu/pkgconfig:/usr/lib/i386-linux-gnu/pkgconfig:/usr/share/pkgconfig")
