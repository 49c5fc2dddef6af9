// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/probe.h"

#include <algorithm>

#include "standalone/admin/camera_stream.h"
#include "standalone/admin/cameras.h"
#include "standalone/api/camera_fields.h"
#include "standalone/api/fields.h"
#include "standalone/api/password_check.h"
#include "standalone/api/still_picture.h"
#include "standalone/base/codec_words.h"
#include "standalone/base/text.h"
#include "standalone/camera/isolated_source.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxProbes = 3;
constexpr int kPictureWidth = 640;
// For each step: to connect, to the first picture, to the next. Well within the host's limit of a request.
constexpr std::chrono::seconds kMaxWait{6};

media::ProbeResult ProbeIsolated(const std::string& source, media::SourceOptions options) {
    options.no_data_limit = kMaxWait;
    return media::Probe(*camera::OpenIsolated(source, options, {}));
}

// Empty where it cannot be decoded: the codec and the size are known all the same.
std::string PictureOf(const Call& call, media::ProbeResult& found) {
    if (found.key_frame.empty()) {
        return "";
    }
    try {
        const std::vector<std::uint8_t> jpeg = SmallJpeg(call, base::CodecName(found.video.codec),
                                                         std::move(found.key_frame), found.video.width, kPictureWidth);
        return base::ToBase64({reinterpret_cast<const char*>(jpeg.data()), jpeg.size()});
    } catch (const Failure&) {
        return "";
    }
}

Json::Value Describe(const Call& call, media::ProbeResult found) {
    Json::Value data;
    data["codec"] = base::CodecWord(found.video.codec);
    data["width"] = found.video.width;
    data["height"] = found.video.height;
    data["rate"] = found.frames_per_second;
    data["audio"] = found.audio.has_value();
    data["picture"] = PictureOf(call, found);
    return data;
}

}  // namespace

std::string ProbeCamera(const Call& call) {
    RequireNoPasswordInQuery(call);
    std::string address;
    bool is_insecure = false;
    int id = 0;
    TakeField(call, "address", address);
    TakeField(call, "insecure", is_insecure);
    TakeField(call, "camera", id);
    admin::RequireManager(call.Records(), call.Actor());
    const admin::CameraSetup stored = id == 0 ? admin::CameraSetup() : admin::ReadCamera(call.Records(), id);
    const media::SourceKinds kinds = camera::NetworkKinds();
    admin::RequireSource(kinds, address);
    const std::optional<store::Credentials> credentials = TakeCredentials(call, stored, {address}, is_insecure);
    if (!call.slots.BeginProbing(call.slot, kMaxProbes)) {
        throw Failure(429, "three cameras are being tested already; try again in a moment", http::kRetrySoonSeconds);
    }
    call.context.CloseRecords();
    try {
        return SuccessAnswer(
            Describe(call, admin::ProbeStream(ProbeIsolated, kinds, address, is_insecure, credentials)));
    } catch (const media::SourceError& failure) {
        Json::Value data;
        data["failed"] = std::string(base::NameOf(failure.Cause()));
        data["message"] = failure.what();
        return SuccessAnswer(data);
    }
}

}  // namespace lookhaven::api
