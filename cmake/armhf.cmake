# Cross build for 32-bit ARM Linux (armv7-a, NEON, hard float) with Debian's
# arm-linux-gnueabihf toolchain; test programs run under qemu-arm.
#   cmake -S . -B build-arm -DCMAKE_TOOLCHAIN_FILE=cmake/armhf.cmake
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR armv7-a)

set(VAMRNB_ARM_TRIPLE arm-linux-gnueabihf)
set(CMAKE_C_COMPILER   ${VAMRNB_ARM_TRIPLE}-gcc)
set(CMAKE_CXX_COMPILER ${VAMRNB_ARM_TRIPLE}-g++)
find_program(VAMRNB_ARM_NM ${VAMRNB_ARM_TRIPLE}-nm)
if(VAMRNB_ARM_NM)
  set(CMAKE_NM ${VAMRNB_ARM_NM} CACHE FILEPATH "nm for the target")
endif()

set(VAMRNB_ARM_FLAGS "-march=armv7-a -mfpu=neon -mfloat-abi=hard")
set(CMAKE_C_FLAGS_INIT   "${VAMRNB_ARM_FLAGS}")
set(CMAKE_CXX_FLAGS_INIT "${VAMRNB_ARM_FLAGS}")

set(CMAKE_FIND_ROOT_PATH /usr/${VAMRNB_ARM_TRIPLE})
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE ONLY)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE ONLY)

find_program(VAMRNB_QEMU_ARM qemu-arm)
if(VAMRNB_QEMU_ARM)
  set(CMAKE_CROSSCOMPILING_EMULATOR ${VAMRNB_QEMU_ARM} -L /usr/${VAMRNB_ARM_TRIPLE})
endif()
