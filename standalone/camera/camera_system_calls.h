// SPDX-License-Identifier: Apache-2.0
//
// Refuses every system call that reading a camera does not need.
//
// Why so        A list of what is allowed stays right when kernels learn new calls.
#pragma once

namespace lookhaven::camera {

// Applies to the calling thread and what it starts, for good. False when this kernel, or what emulates it, has no
// filters. Throws std::system_error.
bool FilterSystemCalls();

}  // namespace lookhaven::camera
