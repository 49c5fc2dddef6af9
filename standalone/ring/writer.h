// SPDX-License-Identifier: Apache-2.0
//
// Writes one stream into its ring.
//
// Why so        The recorder must never wait for a viewer, and must go on where a killed predecessor stopped, so that
//               streams that are running then keep running.
// Invariants    (1) A region that a reader has pinned is never written to.
//               (2) An entry is taken out of the index before any byte of it changes, and enters the index whole.
//               (3) The live entries have consecutive counts.
// Thread safety One thread per writer.
#pragma once

#include <cstdint>
#include <memory>
#include <span>

#include "standalone/base/installation.h"
#include "standalone/ring/stream.h"

namespace lookhaven::ring {

// One frame to write. The span is borrowed for the call.
struct Frame {
    std::span<const unsigned char> data;  // 1 … base::kMaxFrameBytes
    std::int32_t offset = 0;              // of the picture within the data
    bool is_key = false;
    std::int64_t timestamp_micros = 0;
    std::int64_t capture_millis = 0;  // UTC
};

class Writer {
  public:
    // Creates the ring, or adopts the one that a dead writer left when its format is the same and its size fits; one
    // that does not match is retired. Entries of the earlier run are no longer found either way. Throws
    // std::system_error when memory is refused, std::runtime_error when a living writer of another process has it.
    Writer(const base::Installation& installation, StreamId id, const StreamFormat& format, const Geometry& geometry);
    // The orderly end: retires the ring and removes it; memory is freed when the last reader has left.
    ~Writer();
    Writer(Writer&&) noexcept;
    Writer& operator=(Writer&&) noexcept;

    // Appends the frame and wakes the readers. False when it was dropped: a size out of bounds, an offset beyond the
    // data, no room beside what readers are sending, or, after such a drop, a frame that needs the one before. A frame
    // too large for the ring moves the stream to a larger one. Never waits. Throws as the constructor does when the
    // stream moves.
    bool Write(const Frame& frame);

    // Says that the stream's format is now this one; a change moves the stream to a new ring. Throws likewise.
    void SetFormat(const StreamFormat& format);

    // Begins a new run after a reconnect: what is in the ring is no longer found, the numbers go on.
    void StartRun();

    // Says that the writer lives although no frame comes; Write does it by itself.
    void Beat();

    // The attachment, for readers in this process; valid until the stream moves or ends.
    void* Address() const;
    std::uint64_t DroppedFrames() const;
    Geometry CurrentGeometry() const;

  private:
    class Ring;
    std::unique_ptr<Ring> ring_;
};

}  // namespace lookhaven::ring
