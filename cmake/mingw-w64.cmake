# Cross toolchain: Windows with MinGW-w64's posix-thread compilers, for the processor the preset names
# in CMAKE_SYSTEM_PROCESSOR: i686 (the product) or x86_64.
set(CMAKE_SYSTEM_NAME Windows)
if(NOT CMAKE_SYSTEM_PROCESSOR MATCHES "^(i686|x86_64)$")
  message(FATAL_ERROR "CMAKE_SYSTEM_PROCESSOR must be i686 or x86_64 (cmake --preset i686, cmake --preset x86_64)")
endif()
# The checks CMake compiles for itself read this file again; they must see the same processor.
list(APPEND CMAKE_TRY_COMPILE_PLATFORM_VARIABLES CMAKE_SYSTEM_PROCESSOR)
set(TOOLCHAIN_PREFIX ${CMAKE_SYSTEM_PROCESSOR}-w64-mingw32)
set(CMAKE_C_COMPILER ${TOOLCHAIN_PREFIX}-gcc-posix)
set(CMAKE_CXX_COMPILER ${TOOLCHAIN_PREFIX}-g++-posix)
set(CMAKE_RC_COMPILER ${TOOLCHAIN_PREFIX}-windres)
set(CMAKE_FIND_ROOT_PATH /usr/${TOOLCHAIN_PREFIX})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
