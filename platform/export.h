// SPDX-License-Identifier: Apache-2.0
//
// Marks the symbols that cross the boundary between the module and its platform.
#pragma once

#define LH_PLATFORM_API __attribute__((visibility("default")))
