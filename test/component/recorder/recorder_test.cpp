// SPDX-License-Identifier: Apache-2.0
//
// The recorder process: streams while they are requested, changes of cameras, a second recorder, its end and its death.
#include <csignal>

#include <sys/wait.h>

#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/store/cameras.h"
#include "test/component/recorder/recorder_fixture.h"
#include "test/support/camera/mjpeg_camera.h"

namespace lookhaven::test {
namespace {

using std::chrono::seconds;

TEST_F(RecorderTest, StreamRunsWhileItIsRequested) {
    const int camera = AddCamera(kSmallPattern);
    const Child recorder = StartRecorder();
    ASSERT_TRUE(Eventually([&] { return LogLines("started") > 0; }));
    ASSERT_EQ(Segments(), 0u) << "runs without a request";
    std::size_t threads = 0;
    const std::int64_t requested_us = base::MonotonicMicros();
    {
        Viewer viewer(*installation_, camera);
        viewer.Next();
        EXPECT_LT(base::MonotonicMicros() - requested_us, 1'000'000);
        threads = recorder.Count("task");
    }
    // Viewers may be silent for a pause of ten seconds.
    ASSERT_TRUE(Eventually(seconds(30), [&] { return Segments() == 0; }));
    EXPECT_GE(base::MonotonicMicros() - requested_us, 15'000'000);
    EXPECT_TRUE(Eventually([&] { return recorder.Count("task") == threads - 1; }));
}

TEST_F(RecorderTest, ChangesOfACameraTouchThatCameraAlone) {
    const int changed = AddCamera(kSmallPattern);
    const int other = AddCamera(kSmallPattern);
    const Child recorder = StartRecorder();
    Viewer viewer(*installation_, changed);
    Viewer other_viewer(*installation_, other);
    viewer.Next();
    other_viewer.Next();
    ChangeCamera(other, [](store::Camera& camera) { camera.name = "Renamed"; });
    ChangeCamera(changed, [](store::Camera& camera) { camera.profiles[0].source = "test:mjpeg?size=320x240"; });
    ASSERT_TRUE(Eventually([&] { return viewer.Next(), ring::Width(viewer.Ring()) == 320; }));
    ChangeCamera(changed, [](store::Camera& camera) { camera.enabled = false; });
    EXPECT_TRUE(Eventually([&] { return !viewer.HasPicture() && Segments() == 1; }));
    other_viewer.Next();
    EXPECT_EQ(LogLines("camera " + std::to_string(other) + " \"Camera\" stream 0: live"), 1u);
    EXPECT_EQ(LogLines("Renamed"), 0u) << "a name cuts the stream";
}

TEST_F(RecorderTest, WaitsForTheStore) {
    const Child recorder = StartRecorder();
    ASSERT_TRUE(Eventually([&] { return LogLines("cannot read the cameras") > 0; }));
    const std::int64_t failed_us = base::MonotonicMicros();
    ASSERT_TRUE(Eventually([&] { return base::MonotonicMicros() > failed_us + 2'500'000; }));
    EXPECT_EQ(LogLines("cannot read the cameras"), 1u) << "a line for each attempt";
    Viewer(*installation_, AddCamera(kSmallPattern)).Next();
}

TEST_F(RecorderTest, EndsInOrder) {
    MjpegCamera stalled;
    stalled.SetMood(MjpegCamera::Mood::kStall);
    Viewer live(*installation_, AddCamera("test:h264?size=160x120&audio=aac"));
    control::Demand demand(*installation_);
    demand.Request({AddCamera(stalled.Url()), 0});
    demand.Request({AddCamera("http://127.0.0.1:1/"), 0});
    for (const int signal : {SIGTERM, SIGINT}) {
        Child recorder = StartRecorder("60");
        ASSERT_TRUE(Eventually([&] { return live.HasPicture() && stalled.Connections() == 1; }));
        recorder.Signal(signal);
        EXPECT_EQ(recorder.Wait(seconds(2)), 0) << "signal " << signal;
        EXPECT_EQ(Segments(), 0u) << "signal " << signal;
        EXPECT_TRUE(Eventually([&] { return stalled.Connections() == 0; }));
    }
}

TEST_F(RecorderTest, SuccessorOfAKilledRecorderGoesOnInItsRings) {
    const int camera = AddCamera("test:h264?size=160x120&audio=aac");
    Viewer viewer(*installation_, camera);
    Viewer listener(*installation_, camera, base::Medium::kAudio);
    Child first = StartRecorder();
    const Seen before = viewer.Next();
    listener.Next();
    const void* rings[] = {viewer.Ring(), listener.Ring()};
    first.Signal(SIGKILL);
    ASSERT_TRUE(first.Wait());
    const Child second = StartRecorder();
    Seen after;
    ASSERT_TRUE(Eventually([&] { return (after = viewer.Next()).timestamp_us > before.timestamp_us + 500'000; }));
    listener.Next();
    EXPECT_TRUE(viewer.Ring() == rings[0] && listener.Ring() == rings[1]) << "viewers were sent away";
    EXPECT_EQ(Segments(), 2u);
}

TEST_F(RecorderTest, ThatHangsIsToldAsHangingAndLogsTheLostTime) {
    const Child recorder = StartRecorder();
    const auto is = [&](control::RecorderState state) {
        return Eventually([&] { return control::FindRecorder(*installation_) == state; });
    };
    ASSERT_TRUE(Eventually([&] { return LogLines("started for ") == 1; }) && is(control::RecorderState::kAlive));
    recorder.Signal(SIGSTOP);
    EXPECT_TRUE(is(control::RecorderState::kHangs));
    recorder.Signal(SIGCONT);
    EXPECT_TRUE(is(control::RecorderState::kAlive));
    EXPECT_EQ(LogLines("the recorder did not run for "), 1u);
}

TEST_F(RecorderTest, SecondRecorderOfAnInstallationLeaves) {
    Viewer viewer(*installation_, AddCamera(kSmallPattern));
    const Child first = StartRecorder();
    viewer.Next();
    Child second = StartRecorder();
    const std::optional<int> status = second.Wait();
    ASSERT_TRUE(status && WIFEXITED(*status));
    EXPECT_NE(WEXITSTATUS(*status), 0);
    EXPECT_EQ(LogLines("another recorder runs for " + home_.Path().string()), 1u);
    viewer.Take(3);
}

TEST_F(RecorderTest, PatternDecodesWithSound) {
    const int camera = AddCamera("test:h264?size=320x240&gop=10&audio=aac");
    const Child recorder = StartRecorder();
    Viewer viewer(*installation_, camera);
    Viewer listener(*installation_, camera, base::Medium::kAudio);
    const std::vector<Seen> pictures = viewer.Take(45);
    const std::vector<Seen> blocks = listener.Take(100);
    ExpectDecodesFromEveryKeyFrame(pictures, 4);
    EXPECT_STREQ(ring::Codec(listener.Ring()), "AAC");
    EXPECT_EQ(Decoded("aac", ring::ExtraData(listener.Ring()), blocks), blocks.size());
    store::Store store = store::Store::Open(installation_->StoreUrl());
    EXPECT_TRUE(Eventually([&] { return store::Cameras(store).Find(camera)->video_type == base::Codec::kH264; }))
        << "listed as what it was set up as";
    // One clock for both media, and it is the machine's.
    const std::int64_t first_us = pictures.front().timestamp_us;
    for (const Seen& block : blocks) {
        EXPECT_GE(block.timestamp_us, first_us - 500'000);
        EXPECT_LE(block.timestamp_us, base::MonotonicMicros());
    }
}

}  // namespace
}  // namespace lookhaven::test
