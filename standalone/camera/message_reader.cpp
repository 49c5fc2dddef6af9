// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/message_reader.h"

#include <algorithm>
#include <cstring>
#include <string>
#include <utility>

#include "standalone/base/clock.h"
#include "standalone/media/jpeg.h"

namespace lookhaven::camera {

namespace {

// Holds most messages whole, so that each takes one call to receive.
constexpr std::size_t kUsualBytes = 65'536;
// A frame may have waited in the socket while this process was stopped.
constexpr std::int64_t kMaxAgeUs = 600'000'000;
constexpr std::int64_t kMaxAheadUs = 10'000'000;
// Every format of the picture costs what cameras share: a ring, a recording, the id of an event.
constexpr std::int64_t kFormatIntervalUs = 10'000'000;
constexpr int kMaxFormatBurst = 8;
constexpr int kMaxSampleRateHz = 192'000;
constexpr int kMaxChannels = 8;

[[noreturn]] void Refuse(const char* what) {
    throw media::SourceError(std::string("its process sent ") + what);
}

bool IsType(const MessageHead& head, MessageType type) {
    return head.type == static_cast<std::uint8_t>(type);
}

std::size_t MaxBodyBytes(std::uint8_t type) {
    switch (static_cast<MessageType>(type)) {
    case MessageType::kConfined:
    case MessageType::kOpened:
        return 0;
    case MessageType::kFormat:
        return sizeof(FormatBody) + kMaxExtraBytes;
    case MessageType::kFrame:
        return base::kMaxFrameBytes;
    case MessageType::kFailure:
        return kMaxFailureBytes;
    }
    Refuse("an unknown message");
}

bool IsUsable(const FormatBody& format, media::Medium medium) {
    const auto codec = static_cast<base::Codec>(format.codec);
    if (*base::CodecName(codec) == '\0' || base::IsVideo(codec) != (medium == media::Medium::kVideo)) {
        return false;
    }
    if (medium == media::Medium::kVideo) {
        return media::PictureSize{format.width, format.height}.IsUsable() && format.sample_rate_hz == 0 &&
               format.channels == 0;
    }
    return format.width == 0 && format.height == 0 && format.sample_rate_hz > 0 &&
           format.sample_rate_hz <= kMaxSampleRateHz && format.channels > 0 && format.channels <= kMaxChannels;
}

// Goes to the log and to terminals.
std::string Printable(std::span<const std::uint8_t> bytes) {
    std::string text(bytes.begin(), bytes.end());
    std::ranges::replace_if(
        text, [](unsigned char byte) { return byte < ' ' || byte >= 0x7F; }, '?');
    return text;
}

}  // namespace

MessageReader::MessageReader(Input input) : input_(std::move(input)) {}

void MessageReader::CheckHead(const MessageHead& head) const {
    if (head.body_bytes > MaxBodyBytes(head.type)) {
        Refuse("a message above its limit");
    }
    if (head.medium > static_cast<std::uint8_t>(media::Medium::kAudio)) {
        Refuse("an unknown medium");
    }
}

// Has so many unread bytes in the buffer.
void MessageReader::Await(std::size_t bytes) {
    if (end_ - begin_ >= bytes) {
        return;
    }
    std::copy(buffer_.data() + begin_, buffer_.data() + end_, buffer_.data());
    end_ -= std::exchange(begin_, 0);
    buffer_.resize(std::max({buffer_.size(), bytes, kUsualBytes}));
    end_ += input_(std::span(buffer_).subspan(end_), bytes - end_);
}

// Leaves the body in the buffer.
MessageHead MessageReader::ReadMessage() {
    Await(sizeof(MessageHead));
    MessageHead head;
    std::memcpy(&head, buffer_.data() + begin_, sizeof head);
    CheckHead(head);
    Await(sizeof head + head.body_bytes);
    begin_ += sizeof head + head.body_bytes;
    if (IsType(head, MessageType::kFailure)) {
        if (head.flags >= base::kSignalLossNames.size()) {
            Refuse("an unknown cause");
        }
        throw media::SourceError(Printable(Body(head)), static_cast<base::SignalLoss>(head.flags));
    }
    return head;
}

std::uint8_t MessageReader::ReadConfined() {
    const MessageHead head = ReadMessage();
    if (!IsType(head, MessageType::kConfined)) {
        Refuse("something before it confined itself");
    }
    return head.flags;
}

void MessageReader::ReadOpened() {
    MessageHead head = ReadMessage();
    if (IsType(head, MessageType::kFormat) && static_cast<media::Medium>(head.medium) == media::Medium::kAudio) {
        audio_ = ReadFormat(head);
        head = ReadMessage();
    }
    if (!IsType(head, MessageType::kOpened)) {
        Refuse("something before it opened the camera");
    }
}

std::optional<media::StreamFormat> MessageReader::ReadFormat(const MessageHead& head) const {
    FormatBody format;
    if (head.body_bytes < sizeof format) {
        Refuse("a format that is cut off");
    }
    std::memcpy(&format, Body(head).data(), sizeof format);
    if (!IsUsable(format, static_cast<media::Medium>(head.medium))) {
        Refuse("an unusable format");
    }
    const std::span<const std::uint8_t> extra = Body(head).subspan(sizeof format);
    return media::StreamFormat{static_cast<base::Codec>(format.codec),
                               format.width,
                               format.height,
                               format.sample_rate_hz,
                               format.channels,
                               {extra.begin(), extra.end()}};
}

void MessageReader::CountPictureFormat() {
    const std::int64_t now_us = base::MonotonicMicros();
    formats_accounted_until_us_ = std::max(formats_accounted_until_us_, now_us) + kFormatIntervalUs;
    if (formats_accounted_until_us_ > now_us + kMaxFormatBurst * kFormatIntervalUs) {
        Refuse("another format of the picture too often");
    }
}

media::Packet MessageReader::ReadFrame(const MessageHead& head) const {
    const auto medium = static_cast<media::Medium>(head.medium);
    const std::optional<media::StreamFormat>& format = medium == media::Medium::kVideo ? video_ : audio_;
    if (!format) {
        Refuse("a frame without its format");
    }
    if (head.body_bytes == 0) {
        Refuse("an empty frame");
    }
    const std::int64_t now_us = base::MonotonicMicros();
    if (head.timestamp_us < now_us - kMaxAgeUs || head.timestamp_us > now_us + kMaxAheadUs) {
        Refuse("a frame of another time");
    }
    return {medium, Body(head), head.timestamp_us, (head.flags & kKeyFrame) != 0, &*format};
}

media::Packet MessageReader::Next() {
    for (;;) {
        const MessageHead head = ReadMessage();
        if (IsType(head, MessageType::kFrame)) {
            return ReadFrame(head);
        }
        if (!IsType(head, MessageType::kFormat) || static_cast<media::Medium>(head.medium) != media::Medium::kVideo) {
            Refuse("a message out of its turn");
        }
        CountPictureFormat();
        video_ = ReadFormat(head);
    }
}

}  // namespace lookhaven::camera
