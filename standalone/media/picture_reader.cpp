// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/picture_reader.h"

#include <algorithm>
#include <string>

#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

// One decodes the next picture while the other encodes this one.
constexpr int kThreads = 2;

}  // namespace

std::size_t PictureReader::Read(int index, std::span<std::uint8_t> buffer) {
    const archive::RecordedFrame& frame = recording_.At(index);
    const std::string& codec = recording_.Header(frame.segment).codec;
    if (codec == "MJPEG") {
        const archive::FrameEntry& entry = recording_.Entries(frame.segment)[frame.entry];
        if (entry.size > buffer.size()) {
            return ReadSmaller(frame.segment, entry, buffer);
        }
        recording_.ReadBytes(frame.segment, entry, buffer.first(entry.size));
        return entry.size;
    }
    if (decoder_ == nullptr || codec != codec_) {
        decoder_ = LoadDecoderLibrary().OpenDecoder(codec, recording_.Grows() ? 1 : kThreads);
        codec_ = codec;
        is_inside_ = false;
    }
    if (!is_inside_ || segment_ != frame.segment || shown_ != frame.entry) {
        Seek(frame.segment, frame.entry);
        Decode(frame.entry);
    }
    return decoder_->Encode(buffer, 0);
}

std::size_t PictureReader::ReadSmaller(std::uint32_t segment, const archive::FrameEntry& entry,
                                       std::span<std::uint8_t> buffer) {
    bytes_.resize(entry.size);
    recording_.ReadBytes(segment, entry, bytes_);
    const std::vector<std::uint8_t> jpeg = LoadDecoderLibrary().Still("MJPEG", bytes_, buffer.size());
    std::copy(jpeg.begin(), jpeg.end(), buffer.begin());
    return jpeg.size();
}

// Positions the decoder at or before the entry, as close to it as possible.
void PictureReader::Seek(std::uint32_t segment, std::uint32_t entry) {
    const std::span<const archive::FrameEntry> entries = recording_.Entries(segment);
    const std::uint32_t key = recording_.KeyEntryOf(segment, entry);
    const bool is_ahead = is_inside_ && segment_ == segment && key <= next_ &&
                          (shown_ < 0 || entries[entry].time_ms > entries[static_cast<std::size_t>(shown_)].time_ms);
    if (!is_ahead) {
        decoder_->Restart();
        is_inside_ = true;
        segment_ = segment;
        next_ = key;
        shown_ = -1;
    }
}

// Feeds frames until the entry's picture comes out, or the next in presentation order when it cannot be decoded.
void PictureReader::Decode(std::uint32_t entry) {
    const std::span<const archive::FrameEntry> entries = recording_.Entries(segment_);
    for (;;) {
        while (const std::optional<std::int64_t> number = decoder_->Take()) {
            shown_ = *number;
            if (entries[static_cast<std::size_t>(shown_)].time_ms >= entries[entry].time_ms) {
                return;
            }
        }
        if (!is_inside_) {
            throw SourceError("frame " + std::to_string(entry) + " of " + recording_.PathOf(segment_).string() +
                              " cannot be decoded");
        }
        if (next_ < entries.size()) {
            bytes_.resize(entries[next_].size);
            recording_.ReadBytes(segment_, entries[next_], bytes_);
            decoder_->Feed(bytes_, next_, entries[next_].time_ms >= entries[entry].time_ms);
            ++next_;
        } else {
            decoder_->Feed({}, 0);
            is_inside_ = false;  // drained: the decoder must be restarted
        }
    }
}

}  // namespace lookhaven::media
