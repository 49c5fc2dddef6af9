// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/writer.h"

#include <algorithm>
#include <stdexcept>
#include <string>

#include "standalone/base/clock.h"
#include "standalone/base/futex.h"
#include "standalone/base/log.h"
#include "standalone/ring/process_word.h"

namespace lookhaven::ring {

namespace {

constexpr std::uint64_t kMaxArenaBytes = 1ULL << 28;
constexpr std::uint64_t kMinArenaBytes = 1ULL << 14;
constexpr std::uint32_t kMaxIndexSlots = 8192;
// With fewer frames than this in the arena, a few slow readers would leave no space.
constexpr std::uint64_t kMinFrames = 4;

void Retire(const Attachment& attachment) {
    SegmentHead& head = View(attachment.Address()).Head();
    head.retired.store(1);
    head.writer.store(0);
    base::Wake(head.wake);
    attachment.RemoveSegment();
}

// An arena that grew under an earlier run is kept; one that is much too large wastes memory.
bool Fits(const Geometry& found, const Geometry& requested) {
    return found.arena_bytes >= requested.arena_bytes / 2 && found.arena_bytes <= requested.arena_bytes * 16 &&
           found.index_slots >= requested.index_slots / 2;
}

}  // namespace

Writer::Writer(const base::Installation& installation, StreamId id, const StreamFormat& format,
               const Geometry& geometry)
    : installation_(installation.Id()),
      id_(id),
      format_(Stored(format)),
      geometry_{std::clamp<std::uint32_t>(geometry.index_slots, 2, kMaxIndexSlots),
                std::clamp<std::uint64_t>(geometry.arena_bytes, kMinArenaBytes, kMaxArenaBytes)} {
    Open();
}

Writer::~Writer() {
    Close();
}

StreamFormat Writer::Stored(const StreamFormat& format) const {
    StreamFormat stored = Storable(format);
    stored.every_frame_is_key |= id_.medium == Medium::kAudio;
    return stored;
}

void Writer::Open() {
    std::optional<FoundSegment> found = FindSegment(installation_, id_);
    if (!found || !Adopt(*found)) {
        attachment_ = CreateSegment(installation_, id_, format_, geometry_);
    }
    const View view(attachment_.Address());
    geometry_ = view.Size();
    arena_.emplace(view);
    Head().heartbeat_micros.store(base::MonotonicMicros());
    needs_key_frame_ = !format_.every_frame_is_key;
}

// Takes over a dead writer's segment. False when a new one must be created instead.
bool Writer::Adopt(FoundSegment& found) {
    if (found.check != SegmentCheck::kGood) {
        base::LogWarning("ring of " + NameOf(id_) + " has another layout or is damaged: replaced");
        if (found.check == SegmentCheck::kDamaged) {
            Retire(found.attachment);  // tells its viewers to attach again
        } else {
            found.attachment.RemoveSegment();  // where another layout marks it as retired is unknown
        }
        return false;
    }
    SegmentHead& head = View(found.attachment.Address()).Head();
    std::uint64_t writer = head.writer.load();
    if (IsWordAlive(writer) || !head.writer.compare_exchange_strong(writer, OwnWord())) {
        throw std::runtime_error("the ring of " + NameOf(id_) + " is written by process " +
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

void Writer::Close() {
    arena_.reset();
    if (attachment_) {
        Retire(attachment_);
        attachment_ = Attachment();
    }
}

void Writer::Enlarge(std::uint32_t blocks) {
    const std::uint64_t needed = std::uint64_t{blocks} * kBlockBytes * kMinFrames * 2;
    geometry_.arena_bytes = std::min(std::max(geometry_.arena_bytes * 2, needed), kMaxArenaBytes);
    geometry_.index_slots = std::min(geometry_.index_slots * 2, kMaxIndexSlots);
    base::LogInfo("ring of " + NameOf(id_) + " grows to " + std::to_string(geometry_.arena_bytes / 1024) + " KiB");
    Close();
    Open();
}

bool Writer::Drop() {
    ++dropped_;
    Head().dropped.fetch_add(1);
    needs_key_frame_ = !format_.every_frame_is_key;
    return false;
}

bool Writer::Write(const Frame& frame) {
    if (!attachment_) {
        Open();  // moving the stream failed half-way
    }
    if (frame.data.empty() || frame.data.size() > static_cast<std::size_t>(base::kMaxFrameBytes) || frame.offset < 0 ||
        static_cast<std::size_t>(frame.offset) >= frame.data.size()) {
        return Drop();
    }
    const bool is_key = frame.is_key || format_.every_frame_is_key;
    const std::uint32_t blocks = Arena::BlocksFor(frame.data.size());
    const bool too_large = std::uint64_t{blocks} * kBlockBytes * kMinFrames > geometry_.arena_bytes;
    const bool group_too_large =
        is_key && !format_.every_frame_is_key && arena_->HasLostKeyFrame() && geometry_.arena_bytes < kMaxArenaBytes;
    if (too_large || group_too_large) {
        Enlarge(blocks);
    }
    if (needs_key_frame_ && !is_key) {
        return Drop();
    }
    const std::optional<Region> region = arena_->Reserve(blocks);
    if (!region) {
        return Drop();
    }
    arena_->Append(*region, frame, is_key);
    needs_key_frame_ = false;
    return true;
}

void Writer::SetFormat(const StreamFormat& format) {
    if (StreamFormat stored = Stored(format); stored != format_) {
        format_ = std::move(stored);
        Close();
        Open();
    }
}

void Writer::StartRun() {
    if (arena_) {
        arena_->StartRun();
        needs_key_frame_ = !format_.every_frame_is_key;
    }
}

void Writer::Beat() {
    if (attachment_) {
        Head().heartbeat_micros.store(base::MonotonicMicros());
    }
}

}  // namespace lookhaven::ring
