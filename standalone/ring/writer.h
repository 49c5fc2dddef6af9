// SPDX-License-Identifier: Apache-2.0
//
// Writes one stream into its ring.
//
// Why so        The recorder must never wait for a viewer, and a restarted one continues in the ring of its killed
//               predecessor, so that viewers' streams keep running.
// Invariants    (1) A region that a reader has pinned is never written to.
//               (2) An entry is removed from the index before any byte of it changes, and added once it is complete.
//               (3) The live entries have consecutive counts.
// Thread safety One thread per writer.
#pragma once

#include <cstdint>
#include <optional>

#include "standalone/base/installation.h"
#include "standalone/ring/arena.h"
#include "standalone/ring/segment.h"
#include "standalone/ring/segment_keys.h"
#include "standalone/ring/stream.h"

namespace lookhaven::ring {

class Writer {
  public:
    // Creates the ring, or adopts the one that a dead writer left if its format is the same and its size fits; one that
    // does not match is retired. Readers no longer find entries of the earlier run either way. Throws std::system_error
    // when memory is refused, std::runtime_error when a living process writes the stream's ring.
    Writer(const base::Installation& installation, StreamId id, const StreamFormat& format, const Geometry& geometry);
    // The orderly end: retires the ring and removes it; memory is freed when the last reader has left.
    ~Writer();
    Writer(Writer&&) noexcept = default;
    Writer& operator=(Writer&&) noexcept = default;

    // Appends the frame and wakes the readers. False when it was dropped: a size out of bounds, an offset beyond the
    // data, no space beside what readers have pinned, or, after such a drop, any frame before the next key frame. A
    // frame too large for the ring moves the stream to a larger ring; moving throws as the constructor does, and the
    // next call tries again. Never waits for a reader.
    bool Write(const Frame& frame);

    // Sets the stream's format; a change moves the stream to a new ring and throws likewise.
    void SetFormat(const StreamFormat& format);

    // Begins a new run after a reconnect: readers no longer find what is in the ring; sequence numbers continue.
    void StartRun();

    // Updates the heartbeat while no frame comes; Write does so itself.
    void Beat();

    // The attachment, for readers in this process; valid until the stream moves or ends. Null when moving has failed.
    void* Address() const { return attachment_.Address(); }
    std::uint64_t DroppedFrames() const { return dropped_; }
    Geometry CurrentGeometry() const { return geometry_; }

  private:
    void Open();
    void Close();
    bool Adopt(FoundSegment& found);
    void Enlarge(std::uint32_t blocks);
    bool Drop();
    StreamFormat Stored(const StreamFormat& format) const;
    SegmentHead& Head() const { return View(attachment_.Address()).Head(); }

    std::uint64_t installation_;
    StreamId id_;
    StreamFormat format_;
    Geometry geometry_;
    Attachment attachment_;  // none when moving the stream has failed
    std::optional<Arena> arena_;
    bool needs_key_frame_ = false;
    std::uint64_t dropped_ = 0;
};

}  // namespace lookhaven::ring
