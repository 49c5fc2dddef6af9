// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/footage.h"

#include <algorithm>

#include "standalone/binding/rights.h"
#include "standalone/control/flush_request.h"
#include "standalone/store/cameras.h"
#include "standalone/store/mounts.h"
#include "standalone/store/value_names.h"

namespace lookhaven::api {

namespace {

Footage Of(const store::Event& event) {
    return {.id = event.id,
            .kind = std::nullopt,
            .camera_id = event.camera_id,
            .mount_id = event.mount_id,
            .start_s = event.start_s,
            .end_s = event.end_s,
            .grows = event.recording,
            .path = event.path,
            .host_id = event.host_id};
}

Footage Require(const Call& call, std::optional<Footage> footage, store::CameraAccess access) {
    const auto mount = footage ? store::Mounts(call.Records()).Find(footage->mount_id) : std::nullopt;
    if (mount) {
        footage->path = std::filesystem::path(mount->path) / footage->path;
    }
    if (!mount || !binding::MayUse(footage->camera_id, access) || !std::filesystem::exists(footage->path)) {
        throw Failure(404, "there is no such event, or no footage of it");
    }
    return *std::move(footage);
}

}  // namespace

std::optional<store::MarkKind> KindOf(const Call& call) {
    const Json::Value& kind = call.Parameter("kind");
    if (kind.isNull()) {
        return std::nullopt;
    }
    const auto& names = store::MarkKindNames();
    const auto found = kind.isString() ? names.find(kind.asString()) : names.end();
    if (found == names.end()) {
        throw Failure(400, "kind must be alert or pos");
    }
    return found->second;
}

std::optional<Footage> FindFootage(store::Store& records, std::optional<store::MarkKind> kind, int id) {
    if (kind) {
        const auto mark = store::Marks(records).Find(*kind, id);
        const bool is_saved = mark && mark->state == store::MarkState::kSaved && !mark->demo;
        return is_saved ? std::optional(Footage{id, kind, mark->camera_id, mark->mount_id, mark->start_s, mark->end_s,
                                                false, mark->path})
                        : std::nullopt;
    }
    const auto event = store::Events(records).Find(id);
    return event && !event->demo ? std::optional(Of(*event)) : std::nullopt;
}

std::optional<Footage> FindRequestedFootage(const Call& call) {
    if (!call.Parameter("event").isNull()) {
        const auto kind = KindOf(call);
        return FindFootage(call.Records(), kind, call.Parameter("event").asInt());
    }
    const int camera = call.Parameter("camera").asInt();
    if (camera <= 0 || call.Parameter("time_ms").isNull()) {
        throw Failure(400, "needs an event, or a camera and time_ms");
    }
    if (!binding::MayUse(camera, store::CameraAccess::kPlayback) || !store::Cameras(call.Records()).Find(camera)) {
        throw Failure(404, kNoSuchCamera);
    }
    const store::Step back{{camera}, call.NumberOr("time_ms", 0) / 1000 + 1, 0, true};
    const auto event = store::Events(call.Records()).Next(back, store::Reasons::kAny);
    if (!event) {
        throw Failure(404, "nothing was recorded at or before that time");
    }
    return event->demo ? std::nullopt : std::optional(Of(*event));
}

Footage RequireFootage(const Call& call, store::CameraAccess access) {
    const auto kind = KindOf(call);
    return Require(call, FindFootage(call.Records(), kind, call.Parameter("event").asInt()), access);
}

Footage RequestedFootage(const Call& call) {
    return Require(call, FindRequestedFootage(call), store::CameraAccess::kPlayback);
}

archive::RecordingReader OpenFootage(const Call& call, const Footage& footage, std::int64_t until_ms) {
    call.context.CloseRecords();
    // What the row tells is on the disk.
    if (footage.grows && until_ms >= footage.end_s * 1000) {
        control::FlushRequests(call.context.Installation()).Ask(footage.id);
    }
    archive::RecordingReader recording(footage.path);
    if (recording.FrameCount() == 0) {
        throw Failure(404, "nothing of the event is recorded yet");
    }
    return recording;
}

int FrameAt(const archive::RecordingReader& recording, std::int64_t time_ms) {
    const std::int64_t since_start_ms = std::max(time_ms, recording.StartWallMs()) - recording.StartWallMs();
    return std::clamp(recording.IndexAt(since_start_ms), 0, recording.FrameCount() - 1);
}

int RequestedFrame(const Call& call, const archive::RecordingReader& recording) {
    if (call.Parameter("frame").isNull()) {
        return FrameAt(recording, call.NumberOr("time_ms", 0));
    }
    const int frame = call.Parameter("frame").asInt();
    if (frame < 0 || frame >= recording.FrameCount()) {
        throw Failure(404, "the event has no such frame");
    }
    return frame;
}

std::string FrameAtTime(const Call& call) {
    const std::int64_t time_ms = call.NumberOr("time_ms", 0);
    const Footage footage = RequireFootage(call);
    const archive::RecordingReader recording = OpenFootage(call, footage, time_ms);
    const int frame = FrameAt(recording, time_ms);
    Json::Value data;
    data["frame"] = frame;
    data["frame_count"] = recording.FrameCount();
    data["captured_ms"] = Json::Int64{recording.CapturedMs(frame)};
    return SuccessAnswer(data);
}

}  // namespace lookhaven::api
