// SPDX-License-Identifier: Apache-2.0
//
// Marks what crosses the border between the module and its platform.
#pragma once

#define LH_PLATFORM_API __attribute__((visibility("default")))
