// SPDX-License-Identifier: Apache-2.0
//
// The frames that players address: index and time, growth, spans.
#include <random>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/archive/recording_reader.h"
#include "standalone/archive/span_file.h"
#include "standalone/base/clock.h"
#include "test/support/footage/archive_folder.h"

namespace lookhaven::test {
namespace {

using namespace archive;

constexpr std::int64_t kFarFuture = 4'000'000'000'000;  // a wait for the clock would be long

std::vector<std::int64_t> Times(const RecordingReader& recording) {
    std::vector<std::int64_t> times;
    times.reserve(static_cast<std::size_t>(recording.FrameCount()));
    for (int i = 0; i < recording.FrameCount(); ++i) {
        times.push_back(recording.At(i).time_ms);
    }
    return times;
}

// Frames as odd cameras send them: together, evenly, seldom, and some before the one that was sent before.
std::vector<std::uint32_t> RandomTimes(std::mt19937& random) {
    const std::uint32_t steps[] = {0, 1, 3, 33, 40, 999, 1000, 1001, 5000};
    std::vector<std::uint32_t> times{0};
    const std::size_t count = 1 + random() % 60;
    const std::size_t kinds = 1 + random() % std::size(steps);
    while (times.size() < count) {
        times.push_back(times.back() + steps[(random() + count) % kinds]);
    }
    for (std::size_t i = 1; random() % 2 == 0 && i + 3 < times.size(); i += 3) {
        std::rotate(times.begin() + std::ptrdiff_t(i), times.begin() + std::ptrdiff_t(i + 2),
                    times.begin() + std::ptrdiff_t(i + 3));
    }
    return times;
}

void CheckRow(const RecordingReader& recording) {
    const std::vector<std::int64_t> times = Times(recording);
    const int count = recording.FrameCount();
    EXPECT_GE(recording.FrameRate(), 1);
    EXPECT_LE(recording.FrameRate(), 1000);
    for (int i = 1; i < count; ++i) {
        ASSERT_GT(recording.TimeOf(i), recording.TimeOf(i - 1));
        ASSERT_LE(recording.TimeOf(i) - recording.TimeOf(i - 1), 1000) << "a player would stand still";
    }
    const int ahead = recording.Grows() ? 50 : 0;
    for (int i = 0; i < count + ahead; ++i) {
        ASSERT_EQ(recording.IndexAt(recording.TimeOf(i)), i) << i << " of " << count;
    }
    for (std::int64_t time = 0; time <= times.back(); time += 7) {
        const auto last = std::upper_bound(times.begin(), times.end(), time) - times.begin() - 1;
        ASSERT_EQ(recording.IndexAt(time), std::max<std::ptrdiff_t>(last, 0)) << time;
    }
    EXPECT_EQ(recording.IndexAt(-1), -1);
    EXPECT_EQ(recording.IndexAt(INT64_MIN), -1);
    if (!recording.Grows()) {
        EXPECT_EQ(recording.IndexAt(INT64_MAX), count - 1);
        EXPECT_EQ(recording.TimeOf(INT32_MAX), times.back());
    }
}

TEST(RecordingReader, LeadsFromIndexToTimeAndBackForAnyTimes) {
    std::mt19937 random(7);
    for (int round = 0; round < 300; ++round) {
        const ArchiveFolder folder;
        std::vector<std::uint32_t> times = RandomTimes(random);
        FrameIndexWriter index = BeginRecording(folder / "a.mkv", kFarFuture);
        const std::vector<FrameEntry> frames = FramesAt(times);
        RecordingReader recording(folder / "a.mkv");
        std::vector<std::int64_t> offered;
        for (std::size_t done = 0; done < frames.size();) {
            const std::size_t step = std::min<std::size_t>(1 + random() % 30, frames.size() - done);
            index.Append(std::span(frames).subspan(done, step));
            done += step;
            recording.Refresh();
            ASSERT_TRUE(recording.Grows());
            const std::vector<std::int64_t> now = Times(recording);
            ASSERT_TRUE(std::equal(offered.begin(), offered.end(), now.begin())) << "a frame changed its number";
            offered = now;
            if (!now.empty()) {
                CheckRow(recording);
            }
        }
        index.Finish();
        recording.Refresh();
        ASSERT_FALSE(recording.Grows());
        CheckRow(recording);
        if (std::is_sorted(times.begin(), times.end())) {
            EXPECT_EQ(Times(recording), Times(RecordingReader(folder / "a.mkv"))) << "growing and finished differ";
        }
        // Without repeats, the row is the file's frames by time.
        const RecordingReader whole(folder / "a.mkv");
        std::vector<std::uint32_t> shown;
        for (int i = 0; i < whole.FrameCount(); ++i) {
            if (i == 0 || whole.At(i).entry != whole.At(i - 1).entry) {
                shown.push_back(times[whole.At(i).entry]);
            }
        }
        std::sort(times.begin(), times.end());
        ASSERT_EQ(shown, times) << "round " << round;
    }
}

TEST(RecordingReader, KeepsItsRateWithinBounds) {
    const ArchiveFolder folder;
    const std::pair<std::vector<std::uint32_t>, double> rows[] = {
        {{0}, 1}, {{0, 40, 80}, 25}, {{0, 0, 0, 0}, 1000}, {{0, 10'000}, 1}, {{0, 33, 67, 100}, 30}};
    for (const auto& [times, rate] : rows) {
        std::filesystem::remove(folder / "a.index");
        MakeRecording(folder / "a.mkv", times);
        EXPECT_NEAR(RecordingReader(folder / "a.mkv").FrameRate(), rate, 0.01);
    }
    std::filesystem::remove(folder / "a.index");
    MakeRecording(folder / "a.mkv", {});
    EXPECT_THROW(RecordingReader(folder / "a.mkv").FrameRate(), ArchiveError);
}

TEST(RecordingReader, MovesOnWhileASlowCameraSaysNothing) {
    const ArchiveFolder folder;
    FrameIndexWriter index = BeginRecording(folder / "a.mkv", base::WallMillis() - 10'500);
    index.Append(FramesAt({0}));
    const RecordingReader recording(folder / "a.mkv");
    EXPECT_GE(recording.FrameCount(), 7);
    EXPECT_LE(recording.FrameCount(), 10) << "ahead of what may still come";
    FrameIndexWriter stepped = BeginRecording(folder / "b.mkv", base::WallMillis() - 3'600'000);
    stepped.Append(FramesAt({0}));
    EXPECT_LE(RecordingReader(folder / "b.mkv").FrameCount(), 15) << "the clock was set an hour ahead";
}

// The wall clock of three recordings, the last after the clock was set back.
TEST(RecordingReader, JoinsTheRecordingsOfASpan) {
    const ArchiveFolder folder;
    const std::string names[] = {"1970-01-01/000010-1.mkv", "1970-01-01/000012-2.mkv", "1970-01-01/000011-3.mkv"};
    MakeRecording(folder / names[0], {0, 500, 1000, 1500}, 10'000);
    MakeRecording(folder / names[1], {0, 500}, 12'000);
    MakeRecording(folder / names[2], {0, 500}, 11'000);
    struct Row {
        Span span;
        std::vector<std::int64_t> times;
        std::vector<std::uint32_t> segments;
        std::vector<std::int64_t> captured_ms;
    };
    const Row rows[] = {
        {{10'400, 12'500, {names[0], names[1]}},
         {100, 600, 1100, 1600},
         {0, 0, 0, 1},
         {10'500, 11'000, 11'500, 12'000}},
        {{10'400, 12'500, {names[0], names[1], names[2]}},
         {100, 600, 1100, 1600, 1601, 2101},
         {0, 0, 0, 1, 2, 2},
         {10'500, 11'000, 11'500, 12'000, 11'000, 11'500}},
        {{12'000, 12'001, {"1970-01-01/000005-9.mkv", names[1]}}, {0}, {0}, {12'000}},  // one of them is gone
    };
    std::filesystem::create_directories(folder / "1970-01-02");
    const std::filesystem::path path = folder / "1970-01-02/000000-4.span";
    for (const Row& row : rows) {
        WriteSpan(path, row.span);
        const RecordingReader recording(path);
        EXPECT_FALSE(recording.Grows());
        EXPECT_EQ(Times(recording), row.times);
        for (int i = 0; i < recording.FrameCount(); ++i) {
            EXPECT_EQ(recording.At(i).segment, row.segments[static_cast<std::size_t>(i)]);
            EXPECT_EQ(recording.CapturedMs(i), row.captured_ms[static_cast<std::size_t>(i)]);
        }
    }
    WriteSpan(path, {1000, 2000, {"1970-01-01/000005-9.mkv"}});
    EXPECT_THROW(RecordingReader{path}, ArchiveError);
}

TEST(RecordingReader, FollowsASpanIntoRecordingsThatAreMadeLater) {
    const ArchiveFolder folder;
    const std::int64_t begin_ms = base::WallMillis() - 1000;
    const std::string names[] = {"1970-01-01/000010-1.mkv", "1970-01-01/000012-2.mkv"};
    const std::filesystem::path path = folder / "1970-01-01/000000-3.span";
    std::filesystem::create_directories(path.parent_path());
    WriteSpan(path, {begin_ms, begin_ms + 60'000, {}});
    RecordingReader recording(path);
    EXPECT_TRUE(recording.Grows());
    EXPECT_EQ(recording.FrameCount(), 0);
    FrameIndexWriter first = BeginRecording(folder / names[0], begin_ms);
    first.Append(FramesAt({0, 400}));
    WriteSpan(path, {begin_ms, begin_ms + 60'000, {names[0]}});
    recording.Refresh();
    EXPECT_THAT(Times(recording), testing::ElementsAre(0, 400));
    first.Append(std::vector{FramesAt({0, 400, 800}).back()});
    first.Finish();
    FrameIndexWriter second = BeginRecording(folder / names[1], begin_ms + 1200);
    second.Append(FramesAt({0}));
    WriteSpan(path, {begin_ms, begin_ms + 60'000, {names[0], names[1]}});
    recording.Refresh();
    EXPECT_THAT(Times(recording), testing::ElementsAre(0, 400, 800, 1200));
    EXPECT_TRUE(recording.Grows());
}

}  // namespace
}  // namespace lookhaven::test
