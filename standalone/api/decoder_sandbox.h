// SPDX-License-Identifier: Apache-2.0
//
// What a request process gives up before it decodes what a camera made.
//
// Why so        A decoder may have faults that a camera makes use of. The process that plays a recording goes on to open
//               recordings, the store and its files in /tmp, so it keeps what these need: files and local sockets. It
//               loses other programs and processes, and the rarely used parts of the kernel. A still picture needs nothing
//               more once the frame is there, so its process loses nearly all.
#pragma once

#include <vector>

#include <linux/filter.h>

namespace lookhaven::api {

// Throws std::system_error.
std::vector<sock_filter> PlaybackFilter();
// For the calling process alone.
std::vector<sock_filter> StillPictureFilter();

// For good. Where the kernel has no filters it is logged, and the process keeps its calls. Throws std::system_error.
void EnterDecoderSandbox(const std::vector<sock_filter>& filter);

}  // namespace lookhaven::api
