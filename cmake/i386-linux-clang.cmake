# 32-bit x86 Linux with clang and the multilib runtime (GoogleTest for i386
# as Debian builds it with g++). -m32 lives in the compiler itself.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR i686)
set(CMAKE_C_COMPILER clang)
set(CMAKE_C_COMPILER_ARG1 -m32)
set(CMAKE_CXX_COMPILER clang++)
set(CMAKE_CXX_COMPILER_ARG1 -m32)
set(CMAKE_LIBRARY_ARCHITECTURE i386-linux-gnu)
