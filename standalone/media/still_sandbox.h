// SPDX-License-Identifier: Apache-2.0
//
// What a process gives up before it decodes one untrusted picture.
//
// Why so        A decoder may have faults that a picture makes use of. Once the picture is in memory, decoding needs
//               memory and a place for the result, and nothing else of the kernel.
#pragma once

#include <vector>

#include <linux/filter.h>

namespace lookhaven::media {

// Leaves the calling process, which has one thread, memory, time and the descriptors that are open: close what the
// decoder must not write to, and load its library before. For good. Where the kernel has no filters it is logged, and
// the process keeps its calls. Throws std::system_error.
void EnterStillSandbox();

// The same with another filter.
void InstallDecoderFilter(const std::vector<sock_filter>& filter);

}  // namespace lookhaven::media
