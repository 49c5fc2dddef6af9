// SPDX-License-Identifier: Apache-2.0
//
// Refuses every system call that reading a camera does not need.
//
// Why so        A list of what is allowed stays right when kernels learn new calls. A refused call fails with ENOSYS, as on
//               an old kernel, so that the C library takes another way where it knows one. The list is short enough to need
//               no library.
#pragma once

namespace lookhaven::camera {

// Applies to the calling thread and what it starts, for good; call prctl(PR_SET_NO_NEW_PRIVS) first. False when this kernel,
// or what emulates it, has no filters. Throws std::system_error.
bool FilterSystemCalls();

}  // namespace lookhaven::camera
