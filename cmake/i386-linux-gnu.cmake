# 32-bit x86 Linux with the multilib runtime: GCC's compilers unless others
# are given (the clang-i386 preset names clang's; GoogleTest for i386 is
# Debian's, built with g++). -m32 lives in the compiler itself so that flags
# given later on the command line cannot drop it.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR i686)
if(NOT CMAKE_C_COMPILER)
  set(CMAKE_C_COMPILER gcc)
endif()
if(NOT CMAKE_CXX_COMPILER)
  set(CMAKE_CXX_COMPILER g++)
endif()
set(CMAKE_C_COMPILER_ARG1 -m32)
set(CMAKE_CXX_COMPILER_ARG1 -m32)
set(CMAKE_LIBRARY_ARCHITECTURE i386-linux-gnu)
