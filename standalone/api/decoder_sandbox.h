// SPDX-License-Identifier: Apache-2.0
//
// What a request process gives up before it decodes or copies what a camera made.
//
// Why so        A decoder may have faults that a camera makes use of. The process that plays a recording goes on to
//               open recordings, the store and its files in /tmp, so it keeps what these need: files and client
//               sockets. It loses other programs and processes, and the rarely used parts of the kernel. A still
//               picture needs nothing more once the frame is there, so its process loses nearly all. Of the table of
//               requests both keep their own slot (SlotTable::KeepOnly), a player once the host knows it.
#pragma once

#include <string>
#include <vector>

#include <linux/filter.h>

#include "standalone/base/installation.h"
#include "standalone/control/slot_table.h"

namespace lookhaven::api {

// What EnterPlaybackSandbox needs, made once where many players use it. Throws std::system_error.
std::vector<sock_filter> PlaybackFilter(const std::string& store_url);
// Each confines the calling process, which has one thread, for good. Where the kernel has no filters it is logged, and
// the process keeps its calls. Throws std::system_error. EnterPlaybackSandbox leaves the slots alone: call
// SlotTable::KeepOnly, too. EnterStillPictureSandbox does that itself, and does not use Landlock.
void EnterPlaybackSandbox(const base::Installation& installation, const std::vector<sock_filter>& playback_filter);
void EnterStillPictureSandbox(control::SlotTable& slots, const control::Slot& own);

}  // namespace lookhaven::api
