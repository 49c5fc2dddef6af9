// SPDX-License-Identifier: Apache-2.0
//
// The recorder against an RTSP camera that sends one codec or another, changes its picture's size, stalls, loses its
// picture, vanishes and returns.
#include <algorithm>
#include <csignal>
#include <cstdlib>

#include "standalone/base/file.h"
#include "standalone/media/jpeg.h"
#include "standalone/media/still.h"
#include "test/component/recorder/recorder_fixture.h"

namespace lookhaven::test {
namespace {

void ExpectStill(const Seen& key_frame, base::Codec codec, media::PictureSize expected = {320, 240}) {
    const std::vector<std::uint8_t> jpeg = media::JpegOfKeyFrame(
        codec, {reinterpret_cast<const std::uint8_t*>(key_frame.data.data()), key_frame.data.size()});
    const std::optional<media::PictureSize> size = media::JpegSize(jpeg);
    EXPECT_TRUE(size && size->width == expected.width && size->height == expected.height);
}

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
    std::optional<Child> rtsp_camera(StartCamera());
    const int camera = AddCamera("rtsp://127.0.0.1:" + std::to_string(port_) + "/live");
    const Child recorder = StartRecorder("2");  // longer than a connection takes on a busy machine
    Viewer viewer(*installation_, camera);
    Viewer listener(*installation_, camera, base::Medium::kAudio);
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
    EXPECT_EQ(LogLines("redirects"), 0u) << "a camera that ends its stream is told as what it is";
}

TEST_F(RtspTest, EveryCodecComesThroughAndDecodes) {
    struct Row {
        const char* path;
        const char* video;  // the ring's name of the codec, and the decoder's
        const char* video_decoder;
        const char* audio;
        const char* audio_decoder;
    };
    const Row rows[] = {
        {"/h264-pcmu", "H264", "h264", "PCMU", "pcm_mulaw"},
        {"/h265-pcma", "H265", "hevc", "PCMA", "pcm_alaw"},
        {"/h265-opus", "H265", "hevc", "OPUS", "opus"},
        {"/h265-aac", "H265", "hevc", "AAC", "aac"},
        {"/h264", "H264", "h264", "", nullptr},
    };
    MakeStore();
    const Child rtsp_camera = StartCamera();
    const Child recorder = StartRecorder("5");
    for (const Row& row : rows) {
        SCOPED_TRACE(row.path);
        const int camera = AddCamera("rtsp://127.0.0.1:" + std::to_string(port_) + row.path);
        Viewer viewer(*installation_, camera);
        Viewer listener(*installation_, camera, base::Medium::kAudio);
        const std::vector<Seen> pictures = viewer.Take(40);
        ExpectDecodesFromEveryKeyFrame(pictures, 1, row.video_decoder);
        ASSERT_FALSE(HasFailure());
        ExpectStill(*std::find_if(begin(pictures), end(pictures), [](const Seen& seen) { return seen.key_frame; }),
                    row.video == std::string("H265") ? base::Codec::kH265 : base::Codec::kH264);
        EXPECT_STREQ(ring::Codec(viewer.Ring()), row.video);
        EXPECT_FALSE(ring::ExtraData(viewer.Ring()).empty());
        if (row.audio_decoder != nullptr) {
            const std::vector<Seen> blocks = listener.Take(20);
            EXPECT_EQ(Decoded(row.audio_decoder, ring::ExtraData(listener.Ring()), blocks), blocks.size());
        } else {
            EXPECT_FALSE(listener.HasPicture());
        }
        ASSERT_NE(listener.Ring(), nullptr);
        EXPECT_STREQ(ring::Codec(listener.Ring()), row.audio);
    }
}

TEST_F(RtspTest, PictureOfAnotherSizeGoesOnInARingOfItsOwnAndTheSoundStays) {
    const Child rtsp_camera = StartCamera();
    const Child recorder = StartRecorder("5");
    const int camera = AddCamera("rtsp://127.0.0.1:" + std::to_string(port_) + "/live");
    Viewer viewer(*installation_, camera);
    Viewer listener(*installation_, camera, base::Medium::kAudio);
    ExpectDecodesFromEveryKeyFrame(viewer.Take(30), 1);
    listener.Take(5);
    ASSERT_FALSE(HasFailure());
    EXPECT_EQ(ring::Width(viewer.Ring()), 320);
    const std::span extra = ring::ExtraData(viewer.Ring());
    const std::vector<unsigned char> extra_before(extra.begin(), extra.end());
    void* ring_before = ring::Attach(*installation_, {camera, 0, base::Medium::kVideo});
    rtsp_camera.Signal(SIGWINCH);
    std::vector<Seen> pictures(1);
    ASSERT_TRUE(Eventually([&] {
        pictures[0] = viewer.Next();
        return ring::Width(viewer.Ring()) == 640;
    }));
    EXPECT_TRUE(ring::IsRetired(ring_before)) << "its viewers are not told";
    ring::Detach(ring_before);
    for (Seen& picture : viewer.Take(60)) {
        pictures.push_back(std::move(picture));
    }
    ASSERT_TRUE(pictures[0].key_frame);
    ExpectStill(pictures[0], base::Codec::kH264, {640, 480});
    ExpectDecodesFromEveryKeyFrame(pictures, 2);
    EXPECT_FALSE(std::ranges::equal(ring::ExtraData(viewer.Ring()), extra_before));
    EXPECT_TRUE(listener.IsCurrent()) << "the sound has not changed";
    const std::vector<Seen> blocks = listener.Take(20);
    EXPECT_EQ(Decoded("aac", ring::ExtraData(listener.Ring()), blocks), blocks.size());
    EXPECT_EQ(Segments(), 2u);
}

}  // namespace
}  // namespace lookhaven::test
