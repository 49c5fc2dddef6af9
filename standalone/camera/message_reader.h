// SPDX-License-Identifier: Apache-2.0
//
// Reads what a camera's process sends and trusts none of it.
//
// Why so        The process parses what the camera sends, so it may be in the hands of whoever is in the camera. Beyond
//               this reader a packet has what media::Packet promises: a known codec, a size within its limits, a time
//               near now.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <vector>

#include "standalone/camera/messages.h"
#include "standalone/media/packet.h"

namespace lookhaven::camera {

class MessageReader {
  public:
    // Fills the whole buffer, or throws.
    using Input = std::function<void(std::span<std::uint8_t>)>;

    explicit MessageReader(Input input);

    // These are called once each, in this order, before Next. They throw SourceError with the process's own reason when
    // it reports a failure, SourceError for a malformed message, and whatever the input throws.

    // Waits until the process has confined itself; returns the kLacks flags of what this kernel cannot do.
    std::uint8_t ReadConfined();
    // Waits until the source is open.
    void ReadOpened();

    const std::optional<media::StreamFormat>& Audio() const { return audio_; }

    // The next packet, valid until the next call. Throws as above; then only destroy the reader.
    media::Packet Next();

  private:
    MessageHead ReadMessage();
    void CheckHead(const MessageHead& head) const;
    void CountPictureFormat();
    std::optional<media::StreamFormat> ReadFormat(const MessageHead& head) const;
    media::Packet ReadFrame(const MessageHead& head) const;

    std::span<const std::uint8_t> Body(const MessageHead& head) const { return {buffer_.data(), head.body_bytes}; }

    Input input_;
    std::vector<std::uint8_t> buffer_;  // begins with the body of the last message
    std::optional<media::StreamFormat> video_;
    std::int64_t formats_paid_until_us_ = 0;  // each format of the picture moves it on by its interval
    std::optional<media::StreamFormat> audio_;
};

}  // namespace lookhaven::camera
