// SPDX-License-Identifier: Apache-2.0
//
// Which version of Lookhaven this is.
#pragma once

namespace lookhaven::base {

extern const char* const kVersion;  // "0.1.0", of the program that asks

}  // namespace lookhaven::base
