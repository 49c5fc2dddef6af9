// SPDX-License-Identifier: Apache-2.0
//
// Live rings for requests that are not the module's.
#pragma once

#include <chrono>

#include "platform/export.h"
#include "standalone/control/demand.h"

class ShmStreamFifo;

namespace lookhaven::binding {

// As LiveStreamFifoAt and, for the sound, LiveAdoStreamFifoAt, but asks for nobody's rights: the caller has.
LH_PLATFORM_API ShmStreamFifo* AttachLiveRing(control::LiveStream stream);

// Whether the stream's ring has a picture, within the limit; asks the recorder for it as a viewer does. Attaches
// nothing. False at once where the recorder does not run.
LH_PLATFORM_API bool AwaitLiveRing(control::LiveStream stream, std::chrono::microseconds limit);

}  // namespace lookhaven::binding
