// SPDX-License-Identifier: Apache-2.0
//
// Reads the live stream of this process at the pace of its viewer's connection: fewer pictures on a slow one, never
// older.
//
// Thread safety One thread, and one stream in the process: how far it is behind is kept between the calls.
#pragma once

#include "standalone/ring/reader.h"

namespace lookhaven::binding {

// As ring::ReadLatest, but first waits until the last picture has been sent or another is overdue, at most 100 ms.
const ring::Entry* ReadLatestPicture(void* stream, int last_sequence, ring::Position* position);

// As ring::ReadNext for video whose frames depend on each other. Null while what was sent before is still on its way.
// Where that has made the stream late, it resumes at the first key frame that is not. sound: null for a stream that
// does not wait.
const ring::Entry* ReadNextPicture(void* stream, int last_sequence, ring::Position* position,
                                   const ring::SecondReader* sound);

// As ring::ReadNext for sound, which would fill the connection that the pictures wait for. It waits likewise, and
// resumes at the newest where that made it late.
const ring::Entry* ReadNextSound(void* stream, int last_sequence, ring::Position* position);

}  // namespace lookhaven::binding
