// SPDX-License-Identifier: Apache-2.0
//
// Reads one stream from its ring, straight out of shared memory.
//
// Why so        A viewer sends a frame from the ring without copying it. So a reader pins the entry that it is sending,
//               and the writer skips pinned entries. All functions take the address of the attachment itself, since
//               that is all that a ring's caller holds, and passes to shmdt.
// Invariants    (1) An entry between a read and its finish call is never written to.
//               (2) Sizes and offsets read from the segment are checked before use.
// Thread safety One thread per position; any number of readers in any process. The functions that take no position, or
//               a null one, may be called from any thread.
#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "standalone/base/installation.h"
#include "standalone/ring/stream.h"

namespace lookhaven::ring {

// One reader's position in one ring; the caller keeps it and leaves its contents to these functions. A forked child
// must not use its parent's: its reads return null.
struct Position {
    std::uint64_t count = 0;       // of the last entry read
    std::int32_t reader = -1;      // slot in the ring's reader table; -1: none
    std::int32_t pinned = -1;      // index slot of the entry that is pinned; -1: none
    std::uint32_t generation = 0;  // of the ring
};

constexpr int kMaxWaitMillis = 100;

// Attaches the stream's ring; null when there is none. One of another layout or of an impossible size is refused: null
// and a line in the log. Detach with shmdt or Detach.
void* Attach(const base::Installation& installation, const StreamId& id);

// Attaches a private ring of that format which never gets an entry; it vanishes with its detachment. Throws
// std::system_error when memory is refused.
void* AttachEmpty(const StreamId& id, const StreamFormat& format);

void Detach(void* ring);

// Makes the position a reader of the ring; nothing is read yet. When the table is full of living readers the position
// gets no slot, and its reads return null. A null position needs neither StartRead nor StopRead.
void StartRead(void* ring, Position* position);
// Ends the position's reading: unpins its entry and frees its slot. With null: unpins whatever this process has pinned
// in the ring without a position.
void StopRead(void* ring, Position* position);

// The newest entry whatever was read before; null when the ring is empty. Pinned for the process until ReadFinish.
const Entry* ReadLatest(void* ring);
// The newest entry when its number differs from last_sequence, else waits up to wait_millis (at most kMaxWaitMillis)
// for one. A signal cuts the wait. Null when none came.
const Entry* ReadLatest(void* ring, int last_sequence, Position* position, int wait_millis = kMaxWaitMillis);
// The entry after last_sequence, or null when that is the newest. When last_sequence is no longer in the ring: the
// newest key frame, or the newest entry of an audio ring. Never waits.
const Entry* ReadNext(void* ring, int last_sequence, Position* position);
// Whether ReadNext would return an entry after the one that the position read last.
bool HasUnread(const void* ring, const Position& position);
// A stream's other ring and how far the caller has read it; both are borrowed. Null where the stream has only one.
struct SecondReader {
    void* ring = nullptr;
    const Position* position = nullptr;
};
// As ReadNext, but while neither ring holds anything unread it waits up to wait_millis (at most kMaxWaitMillis) for an
// entry of either. A signal cuts the wait. Where the kernel cannot wait for two rings it returns at once.
const Entry* ReadNext(void* ring, int last_sequence, Position* position, const SecondReader& other,
                      int wait_millis = kMaxWaitMillis);
// The newest key frame, or null. Pinned for the process until ReadIFrameFinish.
const Entry* ReadLatestIFrame(void* ring);

// Unpins the position's entry or, with a null position, this entry; a null entry does nothing.
void ReadFinish(void* ring, const Entry* entry, Position* position);
void ReadIFrameFinish(void* ring, const Entry* entry, Position* position);

// The writer has left this ring for good; a reader should attach again.
bool IsRetired(const void* ring);
// The process that writes the ring is alive. Reads /proc: not for each frame.
bool IsWriterAlive(const void* ring);
// The ring holds an entry that its present writer wrote since it started; false while that writer is dead.
bool HasFrameOfThisStart(const void* ring);
// Microseconds since the writer's last heartbeat.
std::int64_t HeartbeatAgeMicros(const void* ring);

// The format, alive as long as the attachment; never null.
const char* Codec(const void* ring);
std::span<const unsigned char> ExtraData(const void* ring);
std::int32_t Width(const void* ring);
std::int32_t Height(const void* ring);
Medium MediumOf(const void* ring);

}  // namespace lookhaven::ring
