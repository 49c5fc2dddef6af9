// SPDX-License-Identifier: Apache-2.0
//
// The recorder against an RTSP camera that stalls, loses its picture, vanishes and returns.
#include <csignal>
#include <cstdlib>

#include "standalone/base/file.h"
#include "test/component/recorder/recorder_fixture.h"

namespace lookhaven::test {

namespace {

class RtspTest : public RecorderTest {
  protected:
    // Waits until the camera listens; port_ is kept for its return.
    Child StartCamera() {
        std::filesystem::remove(home_ / "port");
        Child camera({RTSP_CAMERA_PATH, std::to_string(port_)}, home_ / "port");
        EXPECT_TRUE(Eventually([&] {
            const std::string text = std::filesystem::exists(home_ / "port") ? base::ReadFile(home_ / "port") : "";
            port_ = text.ends_with('\n') ? std::atoi(text.c_str()) : port_;
            return text.ends_with('\n');
        }));
        return camera;
    }

    int port_ = 0;
};

TEST_F(RtspTest, CameraComesBackAfterEveryTroubleAndNothingIsLeftOver) {
    MakeStore();
    std::optional<Child> rtsp_camera(StartCamera());
    const int camera = AddCamera("rtsp://127.0.0.1:" + std::to_string(port_) + "/live");
    const Child recorder = StartRecorder();
    Viewer viewer(*installation_, camera);
    Viewer listener(*installation_, camera, ring::Medium::kAudio);
    ExpectDecodesFromEveryKeyFrame(viewer.Take(60), 2);
    const std::vector<Seen> blocks = listener.Take(20);
    ASSERT_FALSE(HasFailure());
    EXPECT_EQ(Decoded("aac", ring::ExtraData(listener.Ring()), blocks), blocks.size());
    const std::size_t descriptors = recorder.Count("fd");
    const std::size_t threads = recorder.Count("task");
    struct Trouble {
        const char* name;
        int begin;
        int end;
    };
    for (const Trouble& trouble :
         {Trouble{"stalls", SIGSTOP, SIGCONT}, {"loses its picture", SIGUSR1, SIGUSR2}, {"vanishes", SIGKILL, 0}}) {
        SCOPED_TRACE(trouble.name);
        rtsp_camera->Signal(trouble.begin);
        ASSERT_TRUE(Eventually([&] { return !viewer.HasPicture() && !listener.HasPicture(); }))
            << "picture and sound must end together";
        if (trouble.end != 0) {
            rtsp_camera->Signal(trouble.end);
        } else {
            rtsp_camera.reset();
            rtsp_camera.emplace(StartCamera());
        }
        ExpectDecodesFromEveryKeyFrame(viewer.Take(30), 1);
        listener.Next();
    }
    EXPECT_EQ(recorder.Count("fd"), descriptors);
    EXPECT_EQ(recorder.Count("task"), threads);
    EXPECT_EQ(Segments(), 2u);
}

}  // namespace

}  // namespace lookhaven::test
