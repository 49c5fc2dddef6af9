// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Picture: one JPEG of a camera, whatever codec it sends.
//
// Why so        A snapshot exists for Motion JPEG only; a browser that cannot decode a camera's video should still show
//               something. The frame is copied out of the ring before it is decoded, so that the writer need not skip
//               it.
#include "standalone/api/own_apis.h"

#include <array>
#include <cstdio>
#include <optional>
#include <stdexcept>
#include <vector>

#include "platform/camera/camera.h"
#include "platform/live/livestream.h"
#include "standalone/api/decoder_sandbox.h"
#include "standalone/base/log.h"
#include "standalone/binding/rights.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/ring/reader.h"

namespace lookhaven::api {

namespace {

struct KeyFrame {
    std::string codec;
    std::vector<std::uint8_t> data;
    std::int64_t capture_millis = 0;
};

// The newest key frame of the stream; nothing when there is none in time.
std::optional<KeyFrame> NewestKeyFrame(int camera, int stream) {
    ShmStreamFifo* ring = LiveStreamFifoAt(camera, stream);
    if (ring == nullptr) {
        return std::nullopt;
    }
    std::optional<KeyFrame> frame;
    DataEntry* held = ring->ReadLatestIFrame();
    if (held != nullptr) {
        const auto* entry = reinterpret_cast<const ring::Entry*>(held);
        frame = KeyFrame{ring->GetVdoCodec(),
                         {entry->Data() + entry->offset, entry->Data() + entry->length},
                         entry->CaptureMillis()};
    }
    ring->ReadIFrameFinish(held, nullptr);
    ring::Detach(ring);
    return frame;
}

std::vector<std::uint8_t> Jpeg(const Call& call, KeyFrame frame) {
    if (frame.codec == "MJPEG") {
        return std::move(frame.data);
    }
    try {
        const media::DecoderLibrary& decoder = media::LoadDecoderLibrary();
        call.context.CloseRecords();
        EnterStillPictureSandbox(call.slots, call.slot);
        return decoder.Still(frame.codec, frame.data, base::kMaxFrameBytes);
    } catch (const std::runtime_error& problem) {
        base::LogError(std::string("no picture of a key frame: ") + problem.what());
        throw Failure(504, "the camera's picture cannot be decoded");
    }
}

std::string ImageAnswer(const std::vector<std::uint8_t>& jpeg, std::int64_t capture_millis) {
    std::array<char, 200> head{};
    std::snprintf(head.data(), head.size(),
                  "Status: 200 OK\r\nContent-Type: image/jpeg\r\nCache-Control: no-store\r\nContent-Length: %zu\r\n"
                  "X-Capture-Time: %lld.%03d\r\n\r\n",
                  jpeg.size(), static_cast<long long>(capture_millis / 1000), static_cast<int>(capture_millis % 1000));
    return std::string(head.data()).append(reinterpret_cast<const char*>(jpeg.data()), jpeg.size());
}

std::string Get(const Call& call) {
    const int id = call.Parameter("camera").asInt();
    if (id <= 0) {
        throw Failure(400, "camera must be the id of a camera");
    }
    Camera camera;
    if (!binding::MayUse(id, store::CameraAccess::kLive) || camera.Load(id, 0, 0) != 0) {
        throw Failure(404, kNoSuchCamera);
    }
    const Json::Value& asked = call.Parameter("profileType");
    const auto profile = asked.isNull() ? CAM_PROFILE_DEFAULT : static_cast<CAM_PROFILE_TYPE>(asked.asInt());
    const int stream = camera.GetUiStreamNo(profile == CAM_PROFILE_DEFAULT ? camera.GetLiveProfile() : profile);
    std::optional<KeyFrame> frame = NewestKeyFrame(id, stream);
    if (!frame) {
        throw Failure(504, "no picture came");
    }
    const std::int64_t captured = frame->capture_millis;
    return ImageAnswer(Jpeg(call, *std::move(frame)), captured);
}

constexpr Method kMethods[] = {{"Get", Get}};

}  // namespace

const OwnApi kPictureApi{"VEXO.Picture", kMethods};

}  // namespace lookhaven::api
