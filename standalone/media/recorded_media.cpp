// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/recorded_media.h"

#include <algorithm>

#include "standalone/archive/matroska_blocks.h"

namespace lookhaven::media {

RecordedMedia::RecordedMedia(const archive::RecordingReader& recording, int from, bool with_sound)
    : recording_(recording),
      with_sound_(with_sound),
      from_(from) {
    const auto [segment, entry, time_ms] = recording.At(from);
    while (recording.At(placed_).segment < segment) {
        ++placed_;
    }
    Enter(segment, entry);
}

// Begins in a segment whose first frame is at placed_.
void RecordedMedia::Enter(std::uint32_t segment, std::uint32_t entry) {
    segment_ = segment;
    const archive::MatroskaBlocks blocks(recording_.DescriptorOf(segment));
    tracks_ = blocks.Tracks();
    const std::string& sound = blocks.Header().audio_codec;
    audio_codec_ = with_sound_ && tracks_.audio_track != 0 ? sound : "";
    sound_blocks_.reset();
    if (!audio_codec_.empty()) {
        sound_blocks_.emplace(recording_.DescriptorOf(segment), tracks_);
    }
    const bool is_h265 = VideoCodec() == base::CodecName(Codec::kH265);
    video_ = StoredVideo(is_h265 ? Codec::kH265 : Codec::kH264, tracks_.video_private);
    const archive::RecordedFrame& first = recording_.At(placed_);
    base_ms_ = first.time_ms - recording_.Entries(segment)[first.entry].time_ms;
    numbers_.clear();
    first_placed_ = last_placed_ = first.entry;
    next_ = recording_.KeyEntryOf(segment, entry);
    needs_key_ = true;
    previous_.reset();
    sounds_.clear();
    next_sound_ = 0;
}

bool RecordedMedia::EnterNext() {
    if (placed_ >= recording_.FrameCount()) {
        return false;
    }
    const auto [segment, entry, time_ms] = recording_.At(placed_);
    Enter(segment, entry);
    return true;
}

void RecordedMedia::PlaceNew() {
    numbers_.resize(recording_.Entries(segment_).size());
    for (; placed_ < recording_.FrameCount() && recording_.At(placed_).segment == segment_; ++placed_) {
        const std::uint32_t entry = recording_.At(placed_).entry;
        if (!numbers_[entry] || placed_ == from_) {  // else it is repeated
            numbers_[entry] = placed_;
        }
        first_placed_ = std::min(first_placed_, entry);
        last_placed_ = std::max(last_placed_, entry);
    }
}

RecordedMedia::Place RecordedMedia::PlaceOf(std::uint32_t entry) const {
    if (entry < numbers_.size() && numbers_[entry]) {
        return Place::kKnown;
    }
    const bool is_final = placed_ < recording_.FrameCount() || !recording_.Grows();
    if (entry < first_placed_ || (is_final && entry < last_placed_)) {
        return Place::kOutside;
    }
    return is_final ? Place::kBehind : Place::kUnknown;
}

std::optional<RecordedPacket> RecordedMedia::Next() {
    for (PlaceNew();; PlaceNew()) {
        if (auto sound = TakeSound()) {
            return sound;
        }
        switch (PlaceOf(next_)) {
        case Place::kUnknown:
            return std::nullopt;
        case Place::kBehind:
            if (!EnterNext()) {
                return std::nullopt;
            }
            break;
        case Place::kKnown:
        case Place::kOutside:
            return TakeVideo();
        }
    }
}

// The sound that lies before the next frame.
std::optional<RecordedPacket> RecordedMedia::TakeSound() {
    const std::span<const archive::FrameEntry> entries = recording_.Entries(segment_);
    if (previous_ && next_ < entries.size()) {
        sounds_ = sound_blocks_ ? sound_blocks_->Between(entries[*previous_], entries[next_].offset)
                                : std::vector<archive::SoundBlock>();
        next_sound_ = 0;
        previous_.reset();
    }
    if (next_sound_ == sounds_.size()) {
        return std::nullopt;
    }
    const archive::SoundBlock& block = sounds_[next_sound_++];
    Read({.offset = block.offset, .size = block.size});
    return RecordedPacket{Medium::kAudio, bytes_, base_ms_ + block.time_ms,
                          recording_.Header(segment_).start_wall_ms + block.time_ms, std::nullopt};
}

RecordedPacket RecordedMedia::TakeVideo() {
    const std::uint32_t entry = next_++;
    const archive::FrameEntry& frame = recording_.Entries(segment_)[entry];
    previous_ = entry;
    std::span<const std::uint8_t> data;
    if (frame.key || !needs_key_) {
        Read(frame);
        data = video_.ToAnnexB(bytes_, frame.key);
        needs_key_ = data.empty();
    }
    return RecordedPacket{Medium::kVideo, data, base_ms_ + frame.time_ms,
                          recording_.Header(segment_).start_wall_ms + frame.time_ms, numbers_[entry]};
}

void RecordedMedia::Read(const archive::FrameEntry& block) {
    bytes_.resize(block.size);
    recording_.ReadBytes(segment_, block, bytes_);
}

}  // namespace lookhaven::media
