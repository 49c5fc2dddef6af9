// SPDX-License-Identifier: Apache-2.0
//
// Sends the recorder any bytes in the place of a camera's process: what comes out must be packets that the recorder may
// use, and a failure's sentence that can go to a terminal.
//
// Why so        A frame must be of a time near now, which no corpus can hold, so times in the input count from now.
#include "standalone/base/clock.h"
#include "standalone/camera/message_reader.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

namespace {

struct Ended {};

class Process {
  public:
    explicit Process(fuzz::Input bytes) : bytes_(bytes) {}

    // Heads and bodies take turns; an empty body is not asked for.
    void Fill(std::span<std::uint8_t> buffer) {
        const std::span<const std::uint8_t> taken = bytes_.Take(buffer.size());
        if (taken.size() < buffer.size()) {
            throw Ended();
        }
        std::ranges::copy(taken, buffer.begin());
        is_head_ = is_head_ ? HeadWithTime(buffer).body_bytes == 0 : true;
    }

  private:
    static camera::MessageHead HeadWithTime(std::span<std::uint8_t> buffer) {
        camera::MessageHead head;
        fuzz::Require(buffer.size() == sizeof head);
        std::memcpy(&head, buffer.data(), sizeof head);
        const auto now_us = static_cast<std::uint64_t>(base::MonotonicMicros());
        head.timestamp_us = static_cast<std::int64_t>(static_cast<std::uint64_t>(head.timestamp_us) + now_us);
        std::memcpy(buffer.data(), &head, sizeof head);
        return head;
    }

    fuzz::Input bytes_;
    bool is_head_ = true;
};

void CheckFormat(const media::StreamFormat& format, media::Medium medium) {
    fuzz::Require(*base::CodecName(format.codec) != '\0' && format.extra_data.size() <= camera::kMaxExtraBytes);
    fuzz::Require(base::IsVideo(format.codec) == (medium == media::Medium::kVideo));
    fuzz::Require(base::IsVideo(format.codec) ? format.width > 0 && format.width <= base::kMaxSidePixels &&
                                                    format.height > 0 && format.height <= base::kMaxSidePixels
                                              : format.sample_rate_hz > 0 && format.channels > 0);
}

void CheckPacket(const media::Packet& packet) {
    fuzz::Require(packet.format != nullptr && !packet.data.empty() && packet.data.size() <= base::kMaxFrameBytes);
    CheckFormat(*packet.format, packet.medium);
    const std::int64_t now_us = base::MonotonicMicros();
    fuzz::Require(packet.timestamp_us > now_us - 3'600'000'000 && packet.timestamp_us < now_us + 3'600'000'000);
    // Reads all of it, so that the sanitizer sees a frame that is not there.
    std::uint8_t sum = 0;
    for (const std::uint8_t byte : packet.data) {
        sum = static_cast<std::uint8_t>(sum + byte);
    }
    volatile std::uint8_t sink = sum;
    static_cast<void>(sink);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    Process process(fuzz::Input(data, size));
    camera::MessageReader reader([&](std::span<std::uint8_t> buffer, std::size_t at_least) {
        process.Fill(buffer.first(at_least));
        return at_least;
    });
    try {
        reader.ReadConfined();
        reader.ReadOpened();
        if (reader.Audio()) {
            CheckFormat(*reader.Audio(), media::Medium::kAudio);
        }
        for (;;) {
            CheckPacket(reader.Next());
        }
    } catch (const media::SourceError& failure) {
        fuzz::Require(
            std::ranges::all_of(std::string_view(failure.what()), [](char c) { return c >= ' ' && c <= '~'; }));
    } catch (const Ended&) {
    }
    return 0;
}
