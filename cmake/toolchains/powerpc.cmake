# 32-bit, big-endian, with unsigned plain chars: the appliance's own. Run under qemu-user; scripts/abi fills the prefix.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR ppc)
set(CMAKE_C_COMPILER powerpc-linux-gnu-gcc)
set(CMAKE_CXX_COMPILER powerpc-linux-gnu-g++)
set(sysroot /usr/powerpc-linux-gnu)
set(prefix ${CMAKE_CURRENT_LIST_DIR}/../../build/abi/powerpc/prefix)
include(${CMAKE_CURRENT_LIST_DIR}/prefix.cmake)
set(CMAKE_CROSSCOMPILING_EMULATOR qemu-ppc;-L;${sysroot};-E;LD_LIBRARY_PATH=${prefix}/lib)
