# 32-bit x86, from a 64-bit machine's compiler.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR i686)
set(CMAKE_C_FLAGS_INIT "-m32 -idirafter /usr/include/x86_64-linux-gnu")
set(CMAKE_CXX_FLAGS_INIT "-m32 -idirafter /usr/include/x86_64-linux-gnu")
# Some kernels, those of small virtual machines above all, start no 32-bit programs.
execute_process(COMMAND /lib/ld-linux.so.2 --version RESULT_VARIABLE failed OUTPUT_QUIET ERROR_QUIET)
if(failed)
  set(CMAKE_CROSSCOMPILING_EMULATOR qemu-i386)
endif()
