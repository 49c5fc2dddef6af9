// SPDX-License-Identifier: Apache-2.0
//
// Where one camera's events begin and end, on clocks that the test holds: nothing is lost between two of them, whatever
// ends the first.
#include "standalone/recorder/event_segmenter.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/archive/recording_log.h"
#include "standalone/archive/recording_reader.h"
#include "standalone/maintenance/mount_folder.h"
#include "test/support/failing_sync.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"
#include "test/support/wait.h"

namespace lookhaven::recorder {
namespace {

namespace fs = std::filesystem;
using maintenance::RecordingState;

constexpr std::int64_t kNoonMs = 1'772'366'400'000;
constexpr int kFps = 25;

class EventSegmenterTest : public testing::Test {
  protected:
    EventSegmenterTest() {
        for (const int mount : {1, 2}) {
            fs::create_directory(MountPath(mount));
            maintenance::MountFolder::WriteMarker(MountPath(mount), {mount, "here"});
        }
        request_.plan = {"Camera", store::RecordMode::kAlways, 60, 0, 0, 1, MountPath(1), "here"};
        segmenter_.SetRequest(request_);
        Send(test::kH264);  // a key frame each second
    }

    void Send(const char* video_options) {
        clip_ = &test::MakeClip(video_options);
        format_ = std::make_shared<media::MediaFormat>(media::MediaFormat{clip_->format.video, {}});
    }

    fs::path MountPath(int mount) const { return folder_ / std::to_string(mount); }
    std::string StoreUrl() const { return "sqlite:" + (folder_ / "store.db").string(); }

    // Until there are ids for events.
    void OpenStore() {
        store::Store::Migrate(StoreUrl());
        ASSERT_TRUE(test::Eventually(std::chrono::seconds(5), [&] { return rows_.Refresh(4), rows_.HasId(); }));
    }

    void Pass(double seconds, bool with_pictures = true) {
        for (int i = 0; i < static_cast<int>(seconds * kFps); ++i) {
            now_us_ += 1'000'000 / kFps;
            if (with_pictures) {
                const test::OwnedPacket& packet = clip_->packets[fed_++ % clip_->packets.size()];
                taken_late_us_ = packet.key_frame ? late_us_ : taken_late_us_;
                segmenter_.Take({format_, packet.medium, packet.data, now_us_ - taken_late_us_, packet.key_frame});
            }
            segmenter_.Tick();
        }
    }

    std::vector<fs::path> Files() const {
        std::vector<fs::path> files;
        for (const auto& entry : fs::recursive_directory_iterator(folder_.Path())) {
            if (entry.path().extension() == ".mkv") {
                files.push_back(entry.path());
            }
        }
        // By their number, which ends the name.
        std::ranges::sort(files, {}, [](const fs::path& file) {
            return std::stoi(file.stem().string().substr(file.stem().string().find('-') + 1));
        });
        return files;
    }

    const test::ArchiveFolder folder_;
    std::int64_t now_us_ = 1'000'000'000;
    std::int64_t wall_ahead_ms_ = kNoonMs;  // of the monotonic clock
    std::int64_t late_us_ = 0;              // of the pictures from the next key frame on
    std::int64_t taken_late_us_ = 0;
    int space_requests_ = 0;
    std::size_t fed_ = 0;
    EventRowQueue rows_{StoreUrl()};
    RecordingRequest request_;
    EventSegmenter segmenter_{7,
                              {rows_, [this] { return now_us_; }, [this] { return wall_ahead_ms_ + now_us_ / 1000; },
                               [this] { ++space_requests_; }, 10'000'000}};
    const test::Clip* clip_ = nullptr;
    std::shared_ptr<const media::MediaFormat> format_;
};

TEST_F(EventSegmenterTest, ADiskThatLeavesInTheMomentAnEventEndsCostsThatEventsEndAlone) {
    OpenStore();
    Pass(2.48);
    fs::rename(MountPath(1), folder_ / "away");
    segmenter_.Close();
    EXPECT_EQ(segmenter_.OpenEvent(), 0);
    EXPECT_EQ(segmenter_.State(), RecordingState::kDiskFails);
    fs::rename(folder_ / "away", MountPath(1));
    Pass(3);
    segmenter_.Close();
    ASSERT_EQ(Files().size(), 2U);
    EXPECT_GE(archive::RecordingReader(Files().front()).FrameCount(), 60) << "it was on the disk";
    std::array<std::uint8_t, 6> seconds{};
    ASSERT_TRUE(archive::ReadRecordingLog(MountPath(1) / "7", (kNoonMs + 1'000'000) / 1000, seconds));
    EXPECT_THAT(seconds, testing::Each(base::kReasonContinuous)) << "what the disk refused is written later";
    EXPECT_EQ(segmenter_.State(), RecordingState::kReady);
}

// Else retention would leave it alone for ever, and a full disk full.
TEST_F(EventSegmenterTest, AnEventThatTheDiskDoesNotLetFinishIsGivenUpAfterAMinute) {
    OpenStore();
    Pass(2.48);
    const int event = segmenter_.OpenEvent();
    ASSERT_TRUE(segmenter_.Flush(event));
    test::g_failing_syncs = std::numeric_limits<int>::max();
    segmenter_.Close();
    const auto is_open_in_store = [&] {
        rows_.Refresh(4);
        store::Store store = store::Store::Open(StoreUrl());
        const auto row = store::Events(store).Find(event);
        return row && row->recording;
    };
    ASSERT_TRUE(test::Eventually(std::chrono::seconds(5), is_open_in_store));
    Pass(55, false);
    ASSERT_TRUE(is_open_in_store()) << "the disk may come back";
    Pass(10, false);
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(5), [&] { return !is_open_in_store(); }));
    test::g_failing_syncs = 0;
    Pass(3);
    EXPECT_EQ(segmenter_.State(), RecordingState::kRecording);
    EXPECT_NE(segmenter_.OpenEvent(), event);
}

TEST_F(EventSegmenterTest, EventsEndWithoutLosingAFrameBetweenThem) {
    OpenStore();
    struct Row {
        const char* what;
        std::function<void()> happens;
        std::vector<double> seconds;  // of the events, when it happens after 2.48 s of ten
        std::int64_t step_ms = 0;
        const char* video = test::kH264;
    };
    const Row rows[] = {
        {"nothing", [] {}, {10}},
        {"the segments are short", [&] { request_.plan.segment_s = 4; }, {4, 4, 2}},
        {"the clock jumps", [&] { wall_ahead_ms_ += 3'000; }, {3, 7}, 3'000},
        {"the clock is set back", [&] { wall_ahead_ms_ -= 3'600'000; }, {3, 7}, -3'600'000},
        {"the clock is put right", [&] { wall_ahead_ms_ -= 1'900; }, {10}, -1'900},
        {"the pictures' times go back", [&] { late_us_ = 900'000; }, {3, 7}, -900},
        {"the camera stalls", [&] { Pass(4, false); }, {3, 7}, 4'000},
        {"a camera of single pictures stalls", [&] { Pass(4, false); }, {2.48, 7.52}, 4'000, test::kMjpeg},
        {"the camera hesitates", [&] { Pass(2.6, false); }, {10}},
        {"another mount", [&] { request_.plan.mount_id = 2, request_.plan.mount = MountPath(2); }, {3, 7}},
    };
    std::size_t known = 0;
    for (const Row& row : rows) {
        SCOPED_TRACE(row.what);
        const std::int64_t begin_ms = wall_ahead_ms_ + now_us_ / 1000;
        fed_ = 0;
        Send(row.video);
        Pass(2.48);
        row.happens();
        segmenter_.SetRequest(request_);
        Pass(7.52);
        segmenter_.Close();
        late_us_ = 0;
        EXPECT_EQ(segmenter_.State(), RecordingState::kReady);
        const std::vector<fs::path> files = Files();
        ASSERT_EQ(files.size() - known, row.seconds.size());
        std::int64_t expected_ms = begin_ms;
        for (const double seconds : row.seconds) {
            const archive::RecordingReader event(files[known++]);
            const std::string codec = row.video == test::kMjpeg ? "mjpeg," : "h264,";
            EXPECT_EQ(test::Probe(files[known - 1]), codec + std::to_string(std::lround(seconds * kFps)) + "\n");
            EXPECT_FALSE(event.Grows());
            const std::string name = files[known - 1].stem().string();
            const int id = std::stoi(name.substr(name.find('-') + 1));
            store::Store store = store::Store::Open(StoreUrl());
            EXPECT_TRUE(test::Eventually(std::chrono::seconds(5), [&] {
                const auto stored = store::Events(store).Find(id);
                return stored && !stored->recording && stored->frame_count == event.FrameCount();
            })) << event.FrameCount();
            EXPECT_NEAR(static_cast<double>(event.StartWallMs() - expected_ms), 40, 1);
            expected_ms += std::lround(seconds * 1000) + (expected_ms == begin_ms ? row.step_ms : 0);
        }
        if (row.step_ms == 4'000) {
            std::vector<std::uint8_t> log(14);
            archive::ReadRecordingLog(MountPath(1) / "7", begin_ms / 1000, log);
            EXPECT_THAT(log, testing::ElementsAre(1, 1, 1, 0, 0, 0, 1, 1, 1, 1, 1, 1, 1, 1));
        }
        request_.plan.segment_s = 60;
        segmenter_.SetRequest(request_);
        OpenStore();  // more numbers
    }
}

TEST_F(EventSegmenterTest, AnEventGoesOnWhileThereIsNoIdForTheNext) {
    OpenStore();
    rows_.Refresh(0);  // fetches no more
    request_.plan.segment_s = 2;
    segmenter_.SetRequest(request_);
    Pass(1);
    const int event = segmenter_.OpenEvent();
    while (rows_.TakeId()) {
    }
    for (const bool camera_stalls : {false, true}) {
        Pass(4, !camera_stalls);
        Pass(4);
        EXPECT_EQ(segmenter_.State(), RecordingState::kRecording);
        EXPECT_EQ(segmenter_.OpenEvent(), event) << camera_stalls;
    }
    OpenStore();
    Pass(2);
    EXPECT_GT(segmenter_.OpenEvent(), event);
}

TEST_F(EventSegmenterTest, WhatStopsRecordingIsAStateOutOfWhichItFinds) {
    Pass(2);
    EXPECT_EQ(segmenter_.State(), RecordingState::kNoEventId) << "the store has not been reached yet";
    OpenStore();
    const auto is_recorded_again = [&] {
        fed_ = 0;
        Pass(3);
        EXPECT_EQ(segmenter_.State(), RecordingState::kRecording);
        EXPECT_GT(segmenter_.OpenEvent(), 0);
        OpenStore();
    };
    is_recorded_again();
    struct Row {
        RecordingState state;
        bool with_pictures;
        std::function<void()> happens, ends;
    };
    const fs::path hidden = folder_ / "hidden";
    const Row rows[] = {
        {RecordingState::kReady, false, [] {}, [] {}},
        {RecordingState::kReady, true, [&] { request_.plan.mode = store::RecordMode::kNever; },
         [&] { request_.plan.mode = store::RecordMode::kAlways; }},
        {RecordingState::kMountGone, true, [&] { fs::rename(MountPath(1), hidden); },
         [&] { fs::rename(hidden, MountPath(1)); }},
        {RecordingState::kMountGone, true,
         [&] {
             maintenance::MountFolder::WriteMarker(MountPath(1), {1, "elsewhere"});
         },
         [&] {
             maintenance::MountFolder::WriteMarker(MountPath(1), {1, "here"});
         }},
        {RecordingState::kNoMount, true, [&] { request_.plan.mount_id = 0; }, [&] { request_.plan.mount_id = 1; }},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(NameOf(row.state));
        row.happens();
        segmenter_.SetRequest(request_);
        Pass(row.with_pictures ? 3 : 11, row.with_pictures);
        EXPECT_EQ(segmenter_.State(), row.state);
        EXPECT_EQ(segmenter_.OpenEvent(), 0);
        row.ends();
        segmenter_.SetRequest(request_);
        is_recorded_again();
    }
    EXPECT_EQ(space_requests_, 0);
    segmenter_.Close();
    for (const fs::path& file : Files()) {
        EXPECT_FALSE(archive::RecordingReader(file).Grows()) << file;
        EXPECT_THAT(test::Probe(file), testing::MatchesRegex("h264,[0-9]+\n"));
    }
}

TEST_F(EventSegmenterTest, AnAlarmGetsTheSecondsBeforeItAndEndsInTime) {
    OpenStore();
    request_.plan.mode = store::RecordMode::kNever;
    request_.plan.pre_s = 2;
    segmenter_.SetRequest(request_);
    Pass(4.6);
    EXPECT_TRUE(Files().empty());
    const std::int64_t alarm_s = (wall_ahead_ms_ + now_us_ / 1000) / 1000 - 1;  // known a second later
    request_.marks_until_s = alarm_s + 3;
    segmenter_.SetRequest(request_);
    Pass(10);
    ASSERT_EQ(Files().size(), 1U);
    const archive::RecordingReader event(Files().front());
    EXPECT_EQ(event.Header(0).reason, base::kReasonAlarm);
    EXPECT_LE(event.StartWallMs(), alarm_s * 1000 - 2000);
    const std::int64_t end_ms = event.StartWallMs() + event.TimeOf(event.FrameCount() - 1);
    EXPECT_NEAR(static_cast<double>(end_ms - (alarm_s + 3) * 1000), 0, 80);
}

}  // namespace
}  // namespace lookhaven::recorder
