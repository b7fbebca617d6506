# 32-bit, little-endian: run by this machine's own kernel, with the cross compiler's loader and libraries, so that no
# foreign package is needed. scripts/abi fills the prefix.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR i686)
set(CMAKE_C_COMPILER i686-linux-gnu-gcc)
set(CMAKE_CXX_COMPILER i686-linux-gnu-g++)
set(sysroot /usr/i686-linux-gnu)
set(prefix ${CMAKE_CURRENT_LIST_DIR}/../../build/abi/i386/prefix)
include(${CMAKE_CURRENT_LIST_DIR}/prefix.cmake)
set(CMAKE_CROSSCOMPILING_EMULATOR ${sysroot}/lib/ld-linux.so.2;--library-path;${prefix}/lib:${sysroot}/lib)
