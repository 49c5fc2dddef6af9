# SPDX-License-Identifier: Apache-2.0
#
# Debian 12's armhf: 32-bit ARMv7 with hardware floating point.
set(CMAKE_SYSTEM_PROCESSOR armv7l)
set(architecture armhf)
set(triplet arm-linux-gnueabihf)
set(emulator qemu-arm)
# Everything is compiled by one compiler, so what GCC 7.1 changed in calls matters to nobody.
set(CMAKE_CXX_FLAGS_INIT -Wno-psabi)
include(${CMAKE_CURRENT_LIST_DIR}/debian.cmake)
