# Cross build for 64-bit ARM Linux (armv8-a; Advanced SIMD is part of the
# architecture) with Debian's aarch64-linux-gnu toolchain; test programs run
# under qemu-aarch64.
#   cmake -S . -B build-a64 -DCMAKE_TOOLCHAIN_FILE=cmake/aarch64.cmake
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR aarch64)

set(VAMRNB_A64_TRIPLE aarch64-linux-gnu)
set(CMAKE_C_COMPILER   ${VAMRNB_A64_TRIPLE}-gcc)
set(CMAKE_CXX_COMPILER ${VAMRNB_A64_TRIPLE}-g++)
find_program(VAMRNB_A64_NM ${VAMRNB_A64_TRIPLE}-nm)
if(VAMRNB_A64_NM)
  set(CMAKE_NM ${VAMRNB_A64_NM} CACHE FILEPATH "nm for the target")
endif()

set(CMAKE_C_FLAGS_INIT   "-march=armv8-a")
set(CMAKE_CXX_FLAGS_INIT "-march=armv8-a")

set(CMAKE_FIND_ROOT_PATH /usr/${VAMRNB_A64_TRIPLE})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

find_program(VAMRNB_QEMU_A64 qemu-aarch64)
if(VAMRNB_QEMU_A64)
  set(CMAKE_CROSSCOMPILING_EMULATOR ${VAMRNB_QEMU_A64} -L /usr/${VAMRNB_A64_TRIPLE})
endif()
