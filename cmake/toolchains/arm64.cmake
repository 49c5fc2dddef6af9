# SPDX-License-Identifier: Apache-2.0
#
# Debian 12's arm64: 64-bit ARMv8.
set(CMAKE_SYSTEM_PROCESSOR aarch64)
set(architecture arm64)
set(triplet aarch64-linux-gnu)
set(emulator qemu-aarch64)
include(${CMAKE_CURRENT_LIST_DIR}/debian.cmake)
