// SPDX-License-Identifier: Apache-2.0
//
// The parts of one live stream: delays between attempts to connect, rings that fit the camera, or cannot be made.
#include <atomic>
#include <cerrno>

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/shm.h>

#include "standalone/base/clock.h"
#include "standalone/media/pace.h"
#include "standalone/recorder/backoff.h"
#include "standalone/recorder/stream_rate.h"
#include "standalone/recorder/stream_rings.h"
#include "standalone/recorder/stream_worker.h"
#include "standalone/ring/inventory.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/wait.h"

namespace {

std::atomic<bool> g_has_segments = true;

}  // namespace

// In the place of the C library's: a machine whose shared memory is used up.
extern "C" __attribute__((visibility("default"))) int shmget(key_t key, std::size_t bytes, int flags) noexcept {
    static const auto real = reinterpret_cast<decltype(&shmget)>(::dlsym(RTLD_NEXT, "shmget"));
    if ((flags & IPC_CREAT) != 0 && !g_has_segments) {
        errno = ENOSPC;
        return -1;
    }
    return real(key, bytes, flags);
}

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

// A hundred small pictures a second.
class Camera : public media::Source {
  public:
    explicit Camera(std::stop_token stop) : stop_(std::move(stop)) {}
    const std::optional<media::StreamFormat>& Audio() const override { return silence_; }
    media::Packet Next() override {
        const std::int64_t now_us = base::MonotonicMicros();
        if (!media::SleepUntil(now_us + 10'000, stop_)) {
            throw media::SourceError("stopped");
        }
        return {base::Medium::kVideo, picture_, now_us, true, &format_};
    }

  private:
    const std::stop_token stop_;
    const std::optional<media::StreamFormat> silence_;
    const std::vector<std::uint8_t> picture_ = std::vector<std::uint8_t>(100);
    const media::StreamFormat format_{base::Codec::kMjpeg, 160, 120, 0, 0, {}};
};

TEST(StreamWorker, RecordsAlsoWhereNoRingCanBeMade) {
    const test::ArchiveFolder home;
    base::Installation::CreateFolders(home.Path());
    const base::Installation installation(home.Path());
    const media::SourceKinds kinds = {{"fake:", [](const auto&, const auto&, std::stop_token stop) {
                                           return std::unique_ptr<media::Source>(new Camera(std::move(stop)));
                                       }}};
    const auto queue = std::make_shared<FrameQueue>(1 << 20);
    const auto records = [&] {
        for (int pictures = 0; pictures < 20; ++pictures) {
            ASSERT_TRUE(queue->Pop(base::MonotonicMicros() + 10'000'000));
        }
    };
    g_has_segments = false;
    testing::internal::CaptureStderr();
    {
        StreamWorker worker(installation, kinds, {1, 0}, {"Gate", "fake:1", {}}, std::chrono::seconds(10));
        worker.SetRecording(queue);
        records();
        EXPECT_EQ(worker.Signal().codec, base::Codec::kMjpeg) << "it is no camera without signal";
        EXPECT_TRUE(ring::ListSegments(installation).empty());
        g_has_segments = true;
        EXPECT_TRUE(test::Eventually([&] { return ring::ListSegments(installation).size() == 1; })) << "tried again";
        records();
        EXPECT_EQ(worker.Counts().connections, 1U);
    }
    EXPECT_THAT(testing::internal::GetCapturedStderr(), testing::ContainsRegex("error: .*Gate.*no live view: "));
}

}  // namespace
}  // namespace lookhaven::recorder
