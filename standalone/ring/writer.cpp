// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/writer.h"

#include <algorithm>
#include <optional>
#include <stdexcept>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"
#include "standalone/base/log.h"
#include "standalone/ring/arena.h"
#include "standalone/ring/process_word.h"
#include "standalone/ring/segment.h"

namespace lookhaven::ring {

namespace {

constexpr std::uint64_t kMaxArenaBytes = 1ULL << 28;
constexpr std::uint64_t kLeastArenaBytes = 1ULL << 14;
constexpr std::uint32_t kMaxIndexSlots = 8192;
// With fewer frames than this in the arena, a few slow readers would leave no room.
constexpr std::uint64_t kLeastFrames = 4;

std::string Name(const StreamId& id) {
    return "camera " + std::to_string(id.camera) + " stream " + std::to_string(id.stream) +
           (id.medium == Medium::kVideo ? " video" : " audio");
}

void Retire(const Attachment& attachment) {
    SegmentHead& head = View(attachment.Address()).Head();
    head.retired.store(1);
    head.writer.store(0);
    base::Wake(head.wake);
    attachment.RemoveSegment();
}

// An arena that grew under an earlier run is kept; one that is much too large wastes memory.
bool Fits(const Geometry& found, const Geometry& wanted) {
    return found.arena_bytes >= wanted.arena_bytes / 2 && found.arena_bytes <= wanted.arena_bytes * 16 &&
           found.index_slots >= wanted.index_slots / 2;
}

}  // namespace

class Writer::Ring {
  public:
    Ring(std::uint64_t installation, StreamId id, const StreamFormat& format, const Geometry& geometry)
        : installation_(installation),
          id_(id),
          format_(Stored(format)),
          geometry_{std::clamp<std::uint32_t>(geometry.index_slots, 2, kMaxIndexSlots),
                    std::clamp<std::uint64_t>(geometry.arena_bytes, kLeastArenaBytes, kMaxArenaBytes)} {
        Open();
    }
    ~Ring() { Close(); }
    Ring(const Ring&) = delete;
    Ring& operator=(const Ring&) = delete;

    bool Write(const Frame& frame);
    void SetFormat(const StreamFormat& format);
    void StartRun();
    View Segment() const { return View(attachment_.Address()); }
    const Attachment& Attached() const { return attachment_; }
    const Geometry& Size() const { return geometry_; }
    std::uint64_t dropped = 0;

  private:
    StreamFormat Stored(const StreamFormat& format) const;
    void Open();
    void Close();
    bool Adopt(FoundSegment& found);
    void Enlarge(std::uint32_t blocks);
    bool Drop();

    std::uint64_t installation_;
    StreamId id_;
    StreamFormat format_;
    Geometry geometry_;
    Attachment attachment_;
    std::optional<Arena> arena_;
    bool needs_key_frame_ = false;
};

StreamFormat Writer::Ring::Stored(const StreamFormat& format) const {
    StreamFormat stored = Storable(format);
    stored.every_frame_is_key |= id_.medium == Medium::kAudio;
    return stored;
}

void Writer::Ring::Open() {
    std::optional<FoundSegment> found = FindSegment(installation_, id_);
    if (!found || !Adopt(*found)) {
        attachment_ = CreateSegment(installation_, id_, format_, geometry_);
    }
    geometry_ = Segment().Size();
    arena_.emplace(Segment());
    Segment().Head().heartbeat_micros.store(base::MonotonicMicros());
    needs_key_frame_ = !format_.every_frame_is_key;
}

// Takes over a dead writer's segment. False when another one is to be made in its stead.
bool Writer::Ring::Adopt(FoundSegment& found) {
    if (found.check != SegmentCheck::kGood) {
        base::LogWarning("ring of " + Name(id_) + " has another layout or is damaged: replaced");
        if (found.check == SegmentCheck::kDamaged) {
            Retire(found.attachment);  // its viewers are told to come again
        } else {
            found.attachment.RemoveSegment();  // where another layout says it is retired is not known
        }
        return false;
    }
    SegmentHead& head = View(found.attachment.Address()).Head();
    std::uint64_t writer = head.writer.load();
    if (IsWordAlive(writer) || !head.writer.compare_exchange_strong(writer, OwnWord())) {
        throw std::runtime_error("the ring of " + Name(id_) + " is written by process " +
                                 std::to_string(ProcessOf(writer).pid));
    }
    if (View(found.attachment.Address()).Format() != format_ ||
        !Fits(View(found.attachment.Address()).Size(), geometry_)) {
        Retire(found.attachment);
        return false;
    }
    attachment_ = std::move(found.attachment);
    return true;
}

void Writer::Ring::Close() {
    arena_.reset();
    if (attachment_) {
        Retire(attachment_);
        attachment_ = Attachment();
    }
}

void Writer::Ring::Enlarge(std::uint32_t blocks) {
    const std::uint64_t needed = std::uint64_t{blocks} * kBlockBytes * kLeastFrames * 2;
    geometry_.arena_bytes = std::min(std::max(geometry_.arena_bytes * 2, needed), kMaxArenaBytes);
    geometry_.index_slots = std::min(geometry_.index_slots * 2, kMaxIndexSlots);
    base::LogInfo("ring of " + Name(id_) + " grows to " + std::to_string(geometry_.arena_bytes / 1024) + " KiB");
    Close();
    Open();
}

bool Writer::Ring::Drop() {
    ++dropped;
    Segment().Head().dropped.fetch_add(1);
    needs_key_frame_ = !format_.every_frame_is_key;
    return false;
}

bool Writer::Ring::Write(const Frame& frame) {
    if (!attachment_) {
        Open();  // a move failed half-way
    }
    if (frame.data.empty() || frame.data.size() > static_cast<std::size_t>(base::kMaxFrameBytes) || frame.offset < 0 ||
        static_cast<std::size_t>(frame.offset) >= frame.data.size()) {
        return Drop();
    }
    const bool is_key = frame.is_key || format_.every_frame_is_key;
    const std::uint32_t blocks = Arena::BlocksFor(frame.data.size());
    const bool too_large = std::uint64_t{blocks} * kBlockBytes * kLeastFrames > geometry_.arena_bytes;
    const bool group_too_large =
        is_key && !format_.every_frame_is_key && arena_->HasLostKeyFrame() && geometry_.arena_bytes < kMaxArenaBytes;
    if (too_large || group_too_large) {
        Enlarge(blocks);
    }
    if (needs_key_frame_ && !is_key) {
        return Drop();
    }
    const std::optional<Place> place = arena_->MakeRoom(blocks);
    if (!place) {
        return Drop();
    }
    arena_->Append(*place, frame, is_key);
    needs_key_frame_ = false;
    return true;
}

void Writer::Ring::SetFormat(const StreamFormat& format) {
    if (StreamFormat stored = Stored(format); stored != format_) {
        format_ = std::move(stored);
        Close();
        Open();
    }
}

void Writer::Ring::StartRun() {
    if (arena_) {
        arena_->StartRun();
        needs_key_frame_ = !format_.every_frame_is_key;
    }
}

Writer::Writer(const base::Installation& installation, StreamId id, const StreamFormat& format,
               const Geometry& geometry)
    : ring_(std::make_unique<Ring>(installation.Id(), id, format, geometry)) {}

Writer::~Writer() = default;
Writer::Writer(Writer&&) noexcept = default;
Writer& Writer::operator=(Writer&&) noexcept = default;

bool Writer::Write(const Frame& frame) {
    return ring_->Write(frame);
}

void Writer::SetFormat(const StreamFormat& format) {
    ring_->SetFormat(format);
}

void Writer::StartRun() {
    ring_->StartRun();
}

void Writer::Beat() {
    if (ring_->Attached()) {
        ring_->Segment().Head().heartbeat_micros.store(base::MonotonicMicros());
    }
}

void* Writer::Address() const {
    return ring_->Attached().Address();
}

std::uint64_t Writer::DroppedFrames() const {
    return ring_->dropped;
}

Geometry Writer::CurrentGeometry() const {
    return ring_->Size();
}

}  // namespace lookhaven::ring
