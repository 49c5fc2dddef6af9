// SPDX-License-Identifier: Apache-2.0
//
// Reads what a camera's process sends and trusts none of it.
//
// Why so        The process parses what the camera sends, so an attacker who controls the camera may control it too.
//               Beyond this reader a packet has what media::Packet promises: a known codec, a size within its limits,
//               a time near now.
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
    // Fills the beginning of the buffer with at least so many bytes, and with more where they have come; returns how
    // many. Or throws.
    using Input = std::function<std::size_t(std::span<std::uint8_t> buffer, std::size_t at_least)>;

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
    void Await(std::size_t bytes);
    void CheckHead(const MessageHead& head) const;
    void CountPictureFormat();
    std::optional<media::StreamFormat> ReadFormat(const MessageHead& head) const;
    media::Packet ReadFrame(const MessageHead& head) const;

    // The body of the message read last.
    std::span<const std::uint8_t> Body(const MessageHead& head) const {
        return {buffer_.data() + begin_ - head.body_bytes, head.body_bytes};
    }

    Input input_;
    std::vector<std::uint8_t> buffer_;
    std::size_t begin_ = 0;  // of what was received and not read …
    std::size_t end_ = 0;    // … and its end
    std::optional<media::StreamFormat> video_;
    std::int64_t formats_accounted_until_us_ = 0;  // each format of the picture moves it on by its interval
    std::optional<media::StreamFormat> audio_;
};

}  // namespace lookhaven::camera
