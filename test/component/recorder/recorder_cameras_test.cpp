// SPDX-License-Identifier: Apache-2.0
//
// The recorder process and its simulated cameras: what they send, and those that misbehave.
#include <csignal>

#include "standalone/base/file.h"
#include "standalone/base/process.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/store/cameras.h"
#include "test/component/recorder/recorder_fixture.h"
#include "test/support/camera/mjpeg_camera.h"

namespace lookhaven::test {
namespace {

TEST_F(RecorderTest, MotionJpegComesThroughByteByByte) {
    MjpegCamera plain;
    MjpegCamera without_lengths;
    without_lengths.SetMood(MjpegCamera::Mood::kNoLengths);
    MjpegCamera guarded("viewer:se/cr@t");
    const int cameras[] = {AddCamera(plain.Url()), AddCamera(without_lengths.Url()),
                           AddCamera(guarded.Url(), store::Credentials{"viewer", "se/cr@t"})};
    const Child recorder = StartRecorder();
    for (const int camera : cameras) {
        SCOPED_TRACE(camera);
        Viewer viewer(*installation_, camera);
        std::int64_t last = -1;
        for (const Seen& seen : viewer.Take(30)) {
            const std::int64_t number = MjpegCamera::NumberOf(seen.data);
            ASSERT_GE(number, 0) << "a frame that the camera never sent";
            EXPECT_TRUE(last < 0 || number == last + 1) << number << " after " << last;
            EXPECT_TRUE(seen.key_frame);
            last = number;
        }
    }
    EXPECT_EQ(LogLines("cr@t") + LogLines("cr%40t"), 0u) << "a password in the log";
}

TEST_F(RecorderTest, CameraComesBackAfterEveryTroubleAndNothingIsLeftOver) {
    MjpegCamera camera;
    Viewer viewer(*installation_, AddCamera(camera.Url()));
    const Child recorder = StartRecorder();
    viewer.Take(5);
    const std::size_t descriptors = recorder.Count("fd");
    const std::size_t threads = recorder.Count("task");
    const std::size_t segments = Segments();
    const void* ring = viewer.Ring();
    using Mood = MjpegCamera::Mood;
    struct Trouble {
        const char* name;
        std::function<void()> begins;
        std::function<void()> ends = [] {};
    };
    const Trouble troubles[] = {
        {"stalls", [&] { camera.SetMood(Mood::kStall); }},
        {"vanishes", [&] { camera.Vanish(); }, [&] { camera.Return(); }},
        {"sends huge frames", [&] { camera.SetMood(Mood::kHuge); }},
        {"sends a page, which a new connection sees",
         [&] { camera.SetMood(Mood::kPage), camera.Vanish(), camera.Return(); }},
    };
    for (const Trouble& trouble : troubles) {
        SCOPED_TRACE(trouble.name);
        trouble.begins();
        ASSERT_TRUE(Eventually([&] { return !viewer.HasPicture(); })) << "an old picture passes for a live one";
        camera.SetMood(Mood::kFlow);
        trouble.ends();
        EXPECT_GE(MjpegCamera::NumberOf(viewer.Next().data), 0);
    }
    EXPECT_EQ(viewer.Ring(), ring) << "a camera that returns unchanged keeps its ring";
    EXPECT_EQ(recorder.Count("fd"), descriptors);
    EXPECT_EQ(recorder.Count("task"), threads);
    EXPECT_EQ(Segments(), segments);
    EXPECT_EQ(camera.Connections(), 1);
}

TEST_F(RecorderTest, BadCamerasLeaveTheOthersAlone) {
    MjpegCamera page;
    page.SetMood(MjpegCamera::Mood::kPage);
    Viewer good(*installation_, AddCamera(kSmallPattern));
    control::Demand demand(*installation_);
    MjpegCamera guarded("viewer:secret");
    MjpegCamera stalled;
    stalled.SetMood(MjpegCamera::Mood::kStall);
    using enum base::SignalLoss;
    const struct {
        std::string source;
        const char* message;
        base::SignalLoss loss = kOther;
        int camera = 0;
    } rows[] = {
        {"test:nonsense", "unknown test pattern"},
        {"test:mjpeg?size=1x1", "has a size"},
        {"file:" + (home_ / "missing.mkv").string(), "not a regular file"},
        {"file:/dev/zero", "not a regular file"},
        {"file:" + (home_ / "log/recorder").string(), "cannot open"},
        {"http://127.0.0.1:1/", "Connection refused", kRefused},
        {"rtsp://127.0.0.1:1/", "Connection refused", kRefused},
        {"http://unknown.invalid/", "the host name cannot be resolved", kUnknownHost},
        {guarded.Url(), "401", kWrongPassword},
        {stalled.Url(), "no picture for 1000 ms", kStalled},
        {page.Url(), "does not answer with Motion JPEG"},
    };
    std::vector bad(std::begin(rows), std::end(rows));
    for (auto& row : bad) {
        row.camera = AddCamera(row.source);
        demand.Request({row.camera, 0});
    }
    Child recorder = StartRecorder();
    const auto status_of = [&](int camera) {
        const auto all = maintenance::ReadCameraStatus(*installation_);
        const auto found = std::ranges::find(all, camera, &maintenance::CameraStatus::camera);
        return found == all.end() ? maintenance::CameraStatus() : *found;
    };
    for (const auto& row : bad) {
        SCOPED_TRACE(row.source);
        EXPECT_TRUE(Eventually([&] { return good.HasPicture() && LogLines(row.message) > 0; })) << row.message;
        EXPECT_TRUE(Eventually([&] {
            const maintenance::CameraStatus status = status_of(row.camera);
            return status.state == maintenance::RecordingState::kNoSignal && status.loss == row.loss &&
                   status.lost_since_s > 0 && status.loss_reason.find(row.message) != std::string::npos;
        })) << "the owner is not told";
    }
    std::int64_t last_us = good.Next().timestamp_us;
    for (const Seen& seen : good.Take(50)) {
        EXPECT_LE(seen.timestamp_us - last_us, 200'000);
        last_us = seen.timestamp_us;
    }
    EXPECT_EQ(Segments(), 1u);
    EXPECT_EQ(LogLines("does not answer with Motion JPEG"), 1u) << "a line for each attempt";
    EXPECT_EQ(status_of(bad.front().camera - 1).state, maintenance::RecordingState::kReady) << "the good one";
    const int refused = bad[5].camera;
    const std::int64_t since_s = status_of(refused).lost_since_s;
    recorder.Signal(SIGTERM);
    EXPECT_EQ(recorder.Wait(), 0);
    const Child next = StartRecorder();
    for (const auto& row : bad) {
        demand.Request({row.camera, 0});
    }
    ASSERT_TRUE(Eventually([&] { return LogLines("Connection refused") > 2; }));
    EXPECT_TRUE(Eventually([&] { return status_of(refused).lost_since_s == since_s; }))
        << "down since its recorder began";
}

TEST_F(RecorderTest, ProcessOfACameraIsConfinedAndItsDeathIsThatCamerasTrouble) {
    MjpegCamera guarded("viewer:se/cr@t");
    Viewer viewer(*installation_, AddCamera(guarded.Url(), store::Credentials{"viewer", "se/cr@t"}));
    Viewer other(*installation_, AddCamera(kSmallPattern));
    Child recorder = StartRecorder();
    other.Next();
    pid_t last = 0;
    for (const int signal : {SIGABRT, SIGSTOP, SIGKILL}) {
        SCOPED_TRACE(signal);
        ASSERT_GE(MjpegCamera::NumberOf(viewer.Next().data), 0);
        const std::vector<pid_t> children = recorder.Children();
        ASSERT_EQ(children.size(), 1u);
        ASSERT_NE(std::exchange(last, children[0]), children[0]);
        const std::string process = "/proc/" + std::to_string(last);
        const std::string status = base::ReadFile(process + "/status");
        EXPECT_NE(status.find("Seccomp:\t2"), status.npos);
        EXPECT_NE(status.find("NoNewPrivs:\t1"), status.npos);
        EXPECT_EQ(base::ReadFile(process + "/cmdline"), std::string("lookhaven-camera\0", 17));
        ASSERT_EQ(::kill(last, signal), 0);
        ASSERT_TRUE(Eventually([&] { return !viewer.HasPicture(); }));
        EXPECT_TRUE(other.HasPicture());
    }
    EXPECT_EQ(LogLines("its process was ended by signal 6 (") + LogLines("its process was ended by signal 9"), 2u);
    EXPECT_EQ(LogLines("no picture for 1000 ms"), 1u) << "a process that hangs";
    viewer.Next();
    last = recorder.Children().at(0);
    recorder.Signal(SIGKILL);
    EXPECT_TRUE(Eventually([&] { return base::ProcessStartTicks(last) == 0; })) << "outlives the recorder";
}

}  // namespace
}  // namespace lookhaven::test
