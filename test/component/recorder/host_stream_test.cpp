// SPDX-License-Identifier: Apache-2.0
//
// What another host may send in the place of a camera's stream.
#include <cstring>
#include <limits>

#include <gtest/gtest.h>

#include "standalone/base/clock.h"
#include "standalone/recorder/host_stream.h"
#include "standalone/ring/stream_messages.h"
#include "test/support/streaming_host.h"

namespace lookhaven {
namespace {

template <class T>
std::string Bytes(const T& value) {
    return {reinterpret_cast<const char*>(&value), sizeof value};
}

constexpr std::int64_t kHourUs = 3'600'000'000;

// Its clock is an hour ahead. later_us: than now.
std::string Message(ring::MessageType type, const std::string& body = "", int medium = 0, std::uint32_t more_bytes = 0,
                    std::int64_t later_us = 0) {
    return Bytes(ring::MessageHead{static_cast<std::uint8_t>(type), static_cast<std::uint8_t>(medium), 1, 0,
                                   static_cast<std::uint32_t>(body.size()) + more_bytes,
                                   base::MonotonicMicros() + kHourUs + later_us}) +
           body;
}

std::string Format(const char* codec, int width, int height, int medium = 0, const std::string& extra = "") {
    ring::FormatBody format{width, height};
    std::strncpy(format.codec.data(), codec, format.codec.size());
    return Message(ring::MessageType::kFormat, Bytes(format) + extra, medium);
}

// The frames, each with whether its time is now, and how it ends.
std::string Read(const std::string& answer) {
    test::streamed = answer;
    std::string seen;
    try {
        const auto source = recorder::OpenHostStream({1, "North", {}, std::string(64, '0'), 2}, {3, 0}, {}, {});
        for (seen = source->Audio() ? "heard: " : "";;) {
            const media::Packet packet = source->Next();
            const std::int64_t age_us = base::MonotonicMicros() - packet.timestamp_us;
            seen.append(packet.data.begin(), packet.data.end());
            seen.append(packet.format->extra_data.begin(), packet.format->extra_data.end());
            seen += age_us >= 0 && age_us < 10'000'000 ? " " : " of another time ";
        }
    } catch (const media::SourceError& end) {
        return seen + end.what();
    }
}

TEST(HostStream, GivesFramesAndRefusesWhatIsNoStream) {
    using enum ring::MessageType;
    const std::string video = Format("H264", 640, 480, 0, "sps");
    const std::string ended = "host North has ended the stream";
    const std::string format = "host North sent a format that is unknown here";
    std::string clocks_later;
    for (int clock = 0; clock < 6; ++clock) {
        clocks_later += Message(kClock, "", 0, 0, -kHourUs);
    }
    const struct {
        const char* name;
        std::string answer;
        std::string expected;
    } rows[] = {
        {"picture", video + Message(kFrame, "one"), "onesps " + ended},
        {"picture and sound", Format("AAC", 0, 0, 1) + video + Message(kFrame, "a", 1), "heard: a " + ended},
        {"clock and what is not known yet",
         video + Message(kClock) + Message(static_cast<ring::MessageType>(9), "x") + Message(kFrame, "one"),
         "onesps " + ended},
        {"time of the future", video + Message(kFrame, "one", 0, 0, kHourUs), "onesps " + ended},
        {"clock that was long under way", video + Message(kClock, "", 0, 0, -kHourUs) + Message(kFrame, "one"),
         "onesps " + ended},
        {"clock that was not",
         Message(kFormat, video.substr(sizeof(ring::MessageHead)), 0, 0, -kHourUs) + Message(kClock) +
             Message(kFrame, "one"),
         "onesps " + ended},
        {"clock that stood still", video + clocks_later + Message(kFrame, "one", 0, 0, -kHourUs), "onesps " + ended},
        {"time of no clock", video + Message(kFrame, "one", 0, 0, 1LL << 62),
         "host North sent a time that no clock shows"},
        {"clock of no time", video + Message(kClock, "", 0, 0, std::numeric_limits<std::int64_t>::min() / 2),
         "host North sent a time that no clock shows"},
        {"cut off", video + Message(kFrame, "one", 0, 1), ended},
        {"nothing", "", ended},
        {"huge frame", video + Message(kFrame, "", 0, ~std::uint32_t{0}),
         "host North sent a message that is no part of a stream"},
        {"unknown medium", video + Message(kFrame, "x", 2), "host North sent a message that is no part of a stream"},
        {"empty frame", video + Message(kFrame), "host North sent a frame without its format, or an empty one"},
        {"sound without format", video + Message(kFrame, "a", 1),
         "host North sent a frame without its format, or an empty one"},
        {"unknown codec", Format("VP9", 640, 480), format},
        {"name without an end", Format(std::string(32, 'x').c_str(), 640, 480), format},
        {"sound as picture", Format("AAC", 640, 480), format},
        {"no size", Format("H264", 0, 480), format},
        {"huge size", Format("H264", 640, 1 << 30), format},
        {"short format", Message(kFormat, "x"), "host North sent a format of another length"},
        {"long format", Format("H264", 640, 480, 0, std::string(1'025, 'x')),
         "host North sent a format of another length"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        EXPECT_EQ(Read(row.answer), row.expected);
    }
    test::stream_status = 504;
    EXPECT_EQ(Read(video), "host North has no picture of it (status 504)");
}

}  // namespace
}  // namespace lookhaven
