// SPDX-License-Identifier: Apache-2.0
//
// Reads the live stream of this process at the pace of its viewer's connection: fewer pictures on a slow one, never
// older.
//
// Thread safety One thread, and one stream in the process: how far it is behind is kept between the calls.
#pragma once

#include "standalone/ring/reader.h"

namespace lookhaven::binding {

// As ring::ReadLatest, after what was sent before has left, or a picture is overdue. A hundred milliseconds at most.
const ring::Entry* ReadLatestPicture(void* stream, int last_sequence, ring::Position* position);

// As ring::ReadNext with the sound, for a stream whose pictures build on each other: null while what was sent before is
// still on its way; where that has made the stream late it goes on at the first key frame that is not. sound: null for
// a stream that does not wait.
const ring::Entry* ReadNextPicture(void* stream, int last_sequence, ring::Position* position,
                                   const ring::SecondReader* sound);

// As ring::ReadNext for that stream's sound, which would fill the connection that the pictures wait for. It waits too,
// and goes on with the newest where that made it late.
const ring::Entry* ReadNextSound(void* stream, int last_sequence, ring::Position* position);

}  // namespace lookhaven::binding
