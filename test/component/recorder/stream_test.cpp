// SPDX-License-Identifier: Apache-2.0
//
// The parts of one live stream: delays between attempts to connect, and rings that fit the camera.
#include <gtest/gtest.h>

#include "standalone/base/clock.h"
#include "standalone/recorder/backoff.h"
#include "standalone/recorder/stream_rate.h"
#include "standalone/recorder/stream_rings.h"
#include "standalone/ring/inventory.h"
#include "test/support/footage/archive_folder.h"

namespace lookhaven::recorder {
namespace {

TEST(Backoff, GrowsToItsCapAndStartsOverAfterStableFlow) {
    for (std::uint32_t seed = 0; seed < 50; ++seed) {
        Backoff backoff(seed);
        std::int64_t now_us = 0;
        std::chrono::milliseconds max_delay = Backoff::kMinDelay;
        for (int failure = 0; failure < 12; ++failure) {
            // None, one, or two with nine seconds between them.
            for (int picture = 0; picture < failure % 3; ++picture) {
                backoff.NotePicture(now_us += 9'000'000);
            }
            const auto delay = backoff.DelayAfterFailure();
            EXPECT_LE(delay, max_delay);
            EXPECT_GE(delay, max_delay / 2);
            max_delay = std::min<std::chrono::milliseconds>(max_delay * 2, std::chrono::seconds(30));
        }
        backoff.NotePicture(now_us);
        backoff.NotePicture(now_us + std::chrono::microseconds(Backoff::kStable).count());
        EXPECT_LE(backoff.DelayAfterFailure(), Backoff::kMinDelay);
    }
}

TEST(StreamRate, FollowsWhatComesAndStartsOverWithTheStream) {
    StreamRate rate;
    StreamCounts counts;
    std::int64_t now_us = 1;
    const auto pass = [&](std::uint64_t pictures, int seconds) {
        for (; seconds > 0; --seconds) {
            counts.pictures += pictures, counts.bytes += pictures * 1000;
            rate.Note(counts, now_us += 1'000'000);
        }
        return rate.PicturesPerSecond();
    };
    pass(0, 1);
    EXPECT_DOUBLE_EQ(pass(25, 1), 25) << "at once";
    EXPECT_DOUBLE_EQ(rate.BytesPerSecond(), 25'000);
    EXPECT_LT(pass(0, 20), 0.1);
    counts = {};
    EXPECT_LT(pass(1, 1), 1) << "a stream that was started anew counts from 0";
    EXPECT_NEAR(pass(10, 20), 10, 0.5);
}

TEST(StreamRings, FitTheSizeOfTheLatestFormat) {
    const test::ArchiveFolder home;
    base::Installation::CreateFolders(home.Path());
    const base::Installation installation(home.Path());
    StreamRings rings(installation, {1, 0});
    const auto size_after = [&](int width, int height) {
        const media::StreamFormat format{base::Codec::kMjpeg, width, height, 0, 0, {}};
        const std::vector<std::uint8_t> frame(1000);
        rings.Write({base::Medium::kVideo, frame, base::MonotonicMicros(), true, &format}, std::nullopt);
        const std::vector<ring::SegmentState> segments = ring::ListSegments(installation);
        return segments.size() == 1 ? segments[0].size_bytes : 0;
    };
    const std::uint64_t small = size_after(160, 120);
    EXPECT_GT(size_after(1280, 720), 4 * small) << "within a run";
    rings.EndRun();
    EXPECT_EQ(size_after(160, 120), small) << "from run to run";
}

}  // namespace
}  // namespace lookhaven::recorder
