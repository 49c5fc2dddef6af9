// SPDX-License-Identifier: Apache-2.0
//
// What a camera's process sends once somebody has taken it over.
#include <cstring>
#include <limits>
#include <stdexcept>

#include <gtest/gtest.h>

#include "standalone/base/clock.h"
#include "standalone/camera/message_reader.h"

namespace lookhaven::test {
namespace {

using namespace camera;
using base::Codec;
using base::Medium;
using enum MessageType;

constexpr int kAnyType = 9;

template <class T>
std::string Bytes(const T& value) {
    return {reinterpret_cast<const char*>(&value), sizeof value};
}

std::string Message(MessageType type, const std::string& body = "", Medium medium = Medium::kVideo,
                    std::int64_t ahead_us = 0, std::uint32_t more_bytes = 0) {
    return Bytes(MessageHead{static_cast<std::uint8_t>(type), static_cast<std::uint8_t>(medium), kKeyFrame, 0,
                             static_cast<std::uint32_t>(body.size()) + more_bytes,
                             base::MonotonicMicros() + ahead_us}) +
           body;
}

std::string Video(Codec codec, int width, int height, const std::string& extra = "") {
    return Message(kFormat, Bytes(FormatBody{static_cast<int>(codec), width, height, 0, 0}) + extra);
}

std::string Audio(Codec codec, int rate, int channels) {
    return Message(kFormat, Bytes(FormatBody{static_cast<int>(codec), 0, 0, rate, channels}), Medium::kAudio);
}

// The frames that arrive, in order, and then how it ends: "end", or the refusal. At once: they have all come before the
// first is read, else just the bytes that are waited for.
std::string Read(std::string bytes, bool at_once) {
    std::string seen;
    MessageReader reader([&](std::span<std::uint8_t> buffer, std::size_t at_least) {
        if (bytes.size() < at_least) {
            throw std::out_of_range("end");
        }
        const std::size_t size = at_once ? std::min(bytes.size(), buffer.size()) : at_least;
        std::memcpy(buffer.data(), bytes.data(), size);
        bytes.erase(0, size);
        return size;
    });
    try {
        reader.ReadConfined();
        reader.ReadOpened();
        for (;;) {
            const media::Packet packet = reader.Next();
            seen += std::string(packet.data.begin(), packet.data.end()) + (packet.key_frame ? "!" : "") +
                    base::CodecName(packet.format->codec) + std::to_string(packet.format->width) +
                    std::string(packet.format->extra_data.begin(), packet.format->extra_data.end()) + ' ';
        }
    } catch (const std::exception& end) {
        return seen + end.what();
    }
}

TEST(MessageReader, GivesFramesAndRefusesEverythingThatIsMalformed) {
    constexpr std::int64_t kHourUs = 3'600'000'000;
    const std::string confined = Message(kConfined);
    const std::string opened = confined + Message(kOpened);
    const std::string video = opened + Video(Codec::kH264, 640, 480, "sps");
    const std::string sound = confined + Audio(Codec::kAac, 48'000, 2) + Message(kOpened);
    const std::string refused = "its process sent ";
    const std::string long_frame(150'000, 'x');
    std::string flapping = opened;
    for (int width = 100; width < 109; ++width) {
        flapping += Video(Codec::kMjpeg, width, 100);
    }
    const struct {
        const char* name;
        std::string bytes;
        std::string expected;
    } rows[] = {
        {"picture", video + Message(kFrame, "one") + Video(Codec::kH264, 320, 240) + Message(kFrame, "two"),
         "one!H264640sps two!H264320 end"},
        {"longer than what is received at once", video + Message(kFrame, long_frame) + Message(kFrame, "two"),
         long_frame + "!H264640sps two!H264640sps end"},
        {"sound", sound + Message(kFrame, "a", Medium::kAudio), "a!AAC0 end"},
        {"its own reason", confined + Message(kFailure, "cannot open:\n\x1B[2J\xC2\x9B"), "cannot open:??[2J??"},
        {"cut off in a head", video.substr(0, video.size() - 30), "end"},
        {"cut off in a body", video + Message(kFrame, "one", Medium::kVideo, 0, 1), "end"},
        {"not confined", Message(kOpened), refused + "something before it confined itself"},
        {"not opened", confined + Video(Codec::kH264, 640, 480), refused + "something before it opened the camera"},
        {"unknown type", opened + Message(static_cast<MessageType>(kAnyType)), refused + "an unknown message"},
        {"type 0", Message(static_cast<MessageType>(0)), refused + "an unknown message"},
        {"unknown medium", opened + Message(kFrame, "one", static_cast<Medium>(2)), refused + "an unknown medium"},
        {"opened twice", opened + Message(kOpened), refused + "a message out of its turn"},
        {"another sound", sound + Audio(Codec::kOpus, 48'000, 2), refused + "a message out of its turn"},
        {"huge frame", video + Message(kFrame, "", Medium::kVideo, 0, base::kMaxFrameBytes + 1),
         refused + "a message above its limit"},
        {"huge format", opened + Message(kFormat, "", Medium::kVideo, 0, ~std::uint32_t{0}),
         refused + "a message above its limit"},
        {"reason of an unknown kind", opened + Bytes(MessageHead{5, 0, 7, 0, 1, 0}) + "x",
         refused + "an unknown cause"},
        {"huge reason", opened + Message(kFailure, std::string(1025, 'x')), refused + "a message above its limit"},
        {"body of an empty message", Message(kConfined, "x"), refused + "a message above its limit"},
        {"frame before its format", opened + Message(kFrame, "one"), refused + "a frame without its format"},
        {"sound of a silent camera", video + Message(kFrame, "a", Medium::kAudio),
         refused + "a frame without its format"},
        {"empty frame", video + Message(kFrame), refused + "an empty frame"},
        {"frame of the past", video + Message(kFrame, "one", Medium::kVideo, -kHourUs),
         refused + "a frame of another time"},
        {"frame of the future", video + Message(kFrame, "one", Medium::kVideo, kHourUs),
         refused + "a frame of another time"},
        {"time without a distance",
         video + Bytes(MessageHead{4, 0, 0, 0, 1, std::numeric_limits<std::int64_t>::min()}) + "x",
         refused + "a frame of another time"},
        {"format cut off", opened + Message(kFormat, "short"), refused + "a format that is cut off"},
        {"a new size all the time", flapping, refused + "another format of the picture too often"},
        {"eight sizes", flapping.substr(0, flapping.size() - Video(Codec::kMjpeg, 1, 1).size()), "end"},
        {"unknown codec", opened + Video(static_cast<Codec>(2), 640, 480), refused + "an unusable format"},
        {"sound as picture", opened + Video(Codec::kAac, 640, 480), refused + "an unusable format"},
        {"no width", opened + Video(Codec::kMjpeg, 0, 480), refused + "an unusable format"},
        {"negative height", opened + Video(Codec::kMjpeg, 640, -1), refused + "an unusable format"},
        {"huge picture", opened + Video(Codec::kMjpeg, base::kMaxSidePixels + 1, 480), refused + "an unusable format"},
        {"picture as sound", confined + Audio(Codec::kH264, 8000, 1), refused + "an unusable format"},
        {"no rate", confined + Audio(Codec::kAac, 0, 1), refused + "an unusable format"},
        {"many channels", confined + Audio(Codec::kAac, 8000, 9), refused + "an unusable format"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Read(row.bytes, false), row.expected) << row.name;
        EXPECT_EQ(Read(row.bytes, true), row.expected) << row.name << ", at once";
    }
}

}  // namespace
}  // namespace lookhaven::test
