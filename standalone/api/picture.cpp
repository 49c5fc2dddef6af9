// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Picture: one JPEG of a camera, live or recorded, whatever codec it sends.
//
// Why so        A snapshot exists for Motion JPEG only; a browser that cannot decode a camera's video should still show
//               something. The frame is copied out of the ring before it is decoded, so that the writer need not skip
//               it. Of a recording one key frame is read and decoded, so that a list of events may show a picture each.
#include "standalone/api/own_apis.h"

#include <array>
#include <cstdio>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/camera/camera.h"
#include "platform/live/livestream.h"
#include "standalone/api/footage.h"
#include "standalone/api/still_picture.h"
#include "standalone/binding/rights.h"
#include "standalone/ring/reader.h"

namespace lookhaven::api {

namespace {

constexpr int kUsualWidth = 320;
constexpr int kMinWidth = 16;

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
    return DecodeConfined(call, 504, [&frame](const media::DecoderLibrary& decoder) {
        return decoder.Still(frame.codec, frame.data, base::kMaxFrameBytes);
    });
}

// cache: header lines that say who may keep the answer, and for how long.
std::string ImageAnswer(const std::vector<std::uint8_t>& jpeg, std::int64_t capture_millis, const std::string& cache) {
    std::array<char, 160> head{};
    std::snprintf(head.data(), head.size(),
                  "Status: 200 OK\r\nContent-Type: image/jpeg\r\nContent-Length: %zu\r\nX-Capture-Time: %lld.%03d\r\n",
                  jpeg.size(), static_cast<long long>(capture_millis / 1000), static_cast<int>(capture_millis % 1000));
    std::string answer = head.data() + cache + "\r\n";
    return answer.append(reinterpret_cast<const char*>(jpeg.data()), jpeg.size());
}

constexpr const char* kNoStore = "Cache-Control: no-store\r\n";

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
    return ImageAnswer(Jpeg(call, *std::move(frame)), captured, kNoStore);
}

struct RecordedKeyFrame : KeyFrame {
    int width = 0;
    bool is_final = false;  // whenever it is asked for again, the answer is the same
};

RecordedKeyFrame KeyFrameOf(const Call& call) {
    const std::int64_t time_ms = call.NumberOr("time_ms", 0);
    const Footage footage = RequestedFootage(call);
    const archive::RecordingReader recording = OpenFootage(call, footage, time_ms);
    const auto [segment, entry, shown_ms] = recording.At(RequestedFrame(call, recording));
    const archive::FrameEntry& key = recording.Entries(segment)[recording.KeyEntryOf(segment, entry)];
    const archive::IndexHeader& header = recording.Header(segment);
    RecordedKeyFrame frame;
    frame.codec = header.codec;
    frame.width = header.width;
    frame.capture_millis = header.start_wall_ms + key.time_ms;
    // What a camera records later may be nearer to a time behind the event.
    frame.is_final =
        !footage.grows && !recording.Grows() && (!call.Parameter("event").isNull() || time_ms < footage.end_s * 1000);
    frame.data.resize(key.size);
    recording.ReadBytes(segment, key, frame.data);
    return frame;
}

std::string At(const Call& call) {
    const std::int64_t width = call.NumberOr("width", kUsualWidth);
    if (width < kMinWidth || width > base::kMaxSidePixels) {
        throw Failure(400, "width is out of its bounds");
    }
    RecordedKeyFrame frame = KeyFrameOf(call);
    std::string cache = kNoStore;
    if (frame.is_final) {
        // By the cookie, so that nobody gets what another account has looked at in the same browser.
        const std::string tag = '"' + std::to_string(frame.capture_millis) + '-' + std::to_string(width) + '"';
        cache = "Cache-Control: private, max-age=43200, immutable\r\nVary: Cookie\r\nETag: " + tag + "\r\n";
        if (call.request.Header("HTTP_IF_NONE_MATCH") == tag) {
            call.slot.status = 304;
            return "Status: 304 Not Modified\r\n" + cache + "\r\n";
        }
    }
    const std::int64_t captured = frame.capture_millis;
    return ImageAnswer(SmallJpeg(call, frame.codec, std::move(frame.data), frame.width, static_cast<int>(width)),
                       captured, cache);
}

constexpr Method kMethods[] = {{"Get", Get}, {"At", At}};

}  // namespace

const OwnApi kPictureApi{"VEXO.Picture", kMethods};

}  // namespace lookhaven::api
