# Builds 32-bit x86 with the distribution's multilib compiler.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR i686)
set(CMAKE_CXX_FLAGS_INIT "-m32 -march=i686 -msse2 -mfpmath=sse")
set(CMAKE_C_FLAGS_INIT "-m32 -march=i686 -msse2 -mfpmath=sse")

# This machine's own libraries are those of its own width; see i386.cmake.
set(ZAV_LINK_UNPACKED_I386 ON)

# A 64-bit kernel runs what is built here, so tests need no emulator.
set(CMAKE_CROSSCOMPILING_EMULATOR "")
