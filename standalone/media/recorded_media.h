// SPDX-License-Identifier: Apache-2.0
//
// Reads a recording, or a span of several, as it was recorded: compressed video and sound in file order, from the key
// frame on with which decoding of a frame begins.
//
// Why so        Video is read by the index, so it has the same numbers and times as in players of pictures, and
//               continues after damage. Sound is found by scanning what lies between the frames.
// Invariants    (1) The first video frame, and the first after damage, is a key frame.
//               (2) A frame comes once it is known whether it is shown, and under which number.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "standalone/archive/recording_reader.h"
#include "standalone/archive/sound_blocks.h"
#include "standalone/media/stored_video.h"

namespace lookhaven::media {

struct RecordedPacket {
    Medium medium = Medium::kVideo;
    // Video as Annex B, with the parameter sets in front of key frames; sound as it is stored. Valid until the next
    // call. Empty for a frame that is left out, since it is damaged or made from one that is.
    std::span<const std::uint8_t> data;
    std::int64_t time_ms = 0;      // from the start of the recording or span; negative before a span
    std::int64_t captured_ms = 0;  // wall clock
    // The video frame's number, as RecordingReader counts: for a repeated frame the first, or the one that reading
    // began with. Nothing for a frame outside the span that is only needed for decoding others.
    std::optional<int> number;
};

class RecordedMedia {
  public:
    // Begins with the frame of a valid index. The recording must outlive this; it may be refreshed between calls.
    // Throws archive::ArchiveError, std::system_error.
    RecordedMedia(const archive::RecordingReader& recording, int from, bool with_sound);

    // Nothing at the end of what there is; after a refresh there may be more. Throws as above when the recording can no
    // longer be read.
    std::optional<RecordedPacket> Next();

    // The codec of the packet returned last, before the first call that of the first packet: as base::CodecName has it.
    const std::string& VideoCodec() const { return recording_.Header(segment_).codec; }
    // Empty without sound, or where its codec is unknown.
    const std::string& AudioCodec() const { return audio_codec_; }
    // The parameter sets as Annex B; AudioSpecificConfig of AAC. May be empty.
    std::span<const std::uint8_t> VideoExtra() const { return video_.ConfiguredSets(); }
    std::span<const std::uint8_t> AudioExtra() const { return tracks_.audio_private; }

  private:
    enum class Place { kKnown, kOutside, kBehind, kUnknown };

    void Enter(std::uint32_t segment, std::uint32_t entry);
    bool EnterNext();
    void PlaceNew();
    Place PlaceOf(std::uint32_t entry) const;
    std::optional<RecordedPacket> TakeSound();
    RecordedPacket TakeVideo();
    void Read(const archive::FrameEntry& block);

    const archive::RecordingReader& recording_;
    bool with_sound_;
    int from_;
    int placed_ = 0;  // frames of the recording that have a place in numbers_, or belong to segments before
    // These are of the current segment:
    std::uint32_t segment_ = 0;
    archive::MatroskaTracks tracks_;
    std::string audio_codec_;
    StoredVideo video_{Codec::kH264, {}};
    std::optional<archive::SoundBlocks> sound_blocks_;
    std::int64_t base_ms_ = 0;                 // time of its 0 ms
    std::vector<std::optional<int>> numbers_;  // of its entries
    std::uint32_t first_placed_ = 0;
    std::uint32_t last_placed_ = 0;
    std::uint32_t next_ = 0;  // the entry to return next
    bool needs_key_ = true;
    std::optional<std::uint32_t> previous_;  // entry after which sound was not looked for
    std::vector<archive::SoundBlock> sounds_;
    std::size_t next_sound_ = 0;
    std::vector<std::uint8_t> bytes_;
};

}  // namespace lookhaven::media
