// SPDX-License-Identifier: Apache-2.0
//
// Live rings for requests that are not the module's (live.cpp).
#pragma once

#include <chrono>

#include "platform/export.h"
#include "standalone/control/demand.h"

class ShmStreamFifo;

namespace lookhaven::binding {

// As LiveStreamFifoAt, but checks no rights, which the caller must have done: LiveAdoStreamFifoAt then gives the sound.
// Waits for five seconds at most; null when no picture came. The ring stays attached until the process ends.
LH_PLATFORM_API ShmStreamFifo* AttachLiveRing(control::LiveStream stream);

// Whether the stream's ring has a picture, within the limit; asks the recorder for it as a viewer does. Attaches
// nothing. False at once where the recorder does not run.
LH_PLATFORM_API bool AwaitLiveRing(control::LiveStream stream, std::chrono::microseconds limit);

}  // namespace lookhaven::binding
