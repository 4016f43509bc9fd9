# Cross toolchain for 32-bit ARM (hard-float, ILP32) with Debian's arm-linux-gnueabihf
# compiler. Libraries come from Debian's armhf multiarch packages (android-liblog-dev:armhf,
# android-libcutils-dev:armhf, libgtest-dev:armhf, libgmock-dev:armhf); the test programs
# run on the build host under qemu-user, which needs no binfmt registration this way.

set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR arm)
set(CMAKE_LIBRARY_ARCHITECTURE arm-linux-gnueabihf)

set(CMAKE_C_COMPILER arm-linux-gnueabihf-gcc)
set(CMAKE_CXX_COMPILER arm-linux-gnueabihf-g++)

# The ARM sysroot of the cross compiler; multiarch libraries (/usr/lib/arm-linux-gnueabihf)
# and the architecture-independent headers (/usr/include) are found through the host root.
set(CMAKE_FIND_ROOT_PATH /usr/arm-linux-gnueabihf)
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY BOTH)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE BOTH)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE BOTH)

# ctest and gtest_discover_tests run every ARM program through this: qemu-arm with -L
# pointing at the ARM loader and libc, wrapped so that programs may re-execute themselves.
set(CMAKE_CROSSCOMPILING_EMULATOR ${CMAKE_CURRENT_LIST_DIR}/qemu-arm-run)

# Debian keeps the armhf liblog/libcutils outside the loader's search path (android/
# subfolder); the programs we build carry it in their RPATH so they run without
# LD_LIBRARY_PATH (which qemu would hand to the host loader as well).
set(CMAKE_BUILD_RPATH /usr/lib/arm-linux-gnueabihf/android)
