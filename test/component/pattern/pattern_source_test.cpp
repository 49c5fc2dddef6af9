// SPDX-License-Identifier: Apache-2.0
//
// The test pattern as a source: what a probe finds, and stop requests.
#include <thread>

#include <gtest/gtest.h>

#include "standalone/media/probe.h"
#include "standalone/pattern/pattern_source.h"

namespace lookhaven::pattern {
namespace {

TEST(PatternSource, IsProbedLikeACamera) {
    const media::ProbeResult result =
        media::ProbeSource(AllSourceKinds(), "test:h264?size=320x240&fps=10&audio=aac",
                           {.credentials = {}, .no_data_limit = std::chrono::seconds(30)});
    EXPECT_EQ(result.video.codec, base::Codec::kH264);
    EXPECT_EQ(result.video.width, 320);
    EXPECT_NEAR(result.frames_per_second, 10, 0.5);
    ASSERT_TRUE(result.audio);
    EXPECT_EQ(result.audio->codec, base::Codec::kAac);
}

// One that goes on sending hangs here.
TEST(PatternSource, EndsAtAStopRequest) {
    std::stop_source stop;
    const auto source = media::OpenSource(AllSourceKinds(), "test:mjpeg?fps=1&size=160x120", {}, stop.get_token());
    std::jthread stopper([&] { stop.request_stop(); });
    EXPECT_THROW(
        for (;;) { source->Next(); }, media::SourceError);
}

}  // namespace
}  // namespace lookhaven::pattern
