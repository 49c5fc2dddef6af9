// SPDX-License-Identifier: Apache-2.0
//
// Makes the segments of an installation's streams and finds them again.
//
// Why so        Keys can be computed and taken by any local user. A stream therefore has 65,536 keys, of which the
//               first free one is used, and a ring is found by going through this user's segments, not by a key: what
//               others take or give back changes nothing. Keys only narrow the search.
#pragma once

#include <cstdint>
#include <optional>

#include <sys/types.h>

#include "standalone/ring/attachment.h"
#include "standalone/ring/segment.h"
#include "standalone/ring/stream.h"

namespace lookhaven::ring {

// Keys of this system's segments share their highest byte.
bool IsRingKey(key_t key);

// Removes the segment, which has a ring key, if its creator was killed before the magic was written: nobody else ever
// would. What may be another program's or another installation's stays.
bool RemoveIfAbandoned(std::uint64_t installation, int shm_id);

// A segment with the stream's identity; retired ones are skipped.
struct FoundSegment {
    Attachment attachment;
    SegmentCheck check = SegmentCheck::kGood;
};
std::optional<FoundSegment> FindSegment(std::uint64_t installation, const StreamId& id);

// Makes a segment that this process writes, with no entry in it. Logs when another user has taken a key. Throws
// std::system_error when memory or every key is refused.
Attachment CreateSegment(std::uint64_t installation, const StreamId& id, const StreamFormat& format,
                         const Geometry& geometry);
// The same without a name.
Attachment CreatePrivateSegment(const StreamId& id, const StreamFormat& format, const Geometry& geometry);

}  // namespace lookhaven::ring
