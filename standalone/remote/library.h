// SPDX-License-Identifier: Apache-2.0
//
// The library of this folder that is loaded when it is first needed.
#pragma once

namespace lookhaven::remote {

// Throws std::runtime_error when the library, or a function of that name in it, cannot be loaded.
void* FindInLibrary(const char* name);

}  // namespace lookhaven::remote
