# 32-bit x86 Linux with the multilib compilers. -m32 lives in the compiler
# itself so that flags given later on the command line cannot drop it.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR i686)
set(CMAKE_C_COMPILER gcc)
set(CMAKE_C_COMPILER_ARG1 -m32)
set(CMAKE_CXX_COMPILER g++)
set(CMAKE_CXX_COMPILER_ARG1 -m32)
set(CMAKE_LIBRARY_ARCHITECTURE i386-linux-gnu)
