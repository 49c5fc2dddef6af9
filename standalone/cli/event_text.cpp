// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/event_text.h"

#include <string>

#include "standalone/cli/camera_options.h"
#include "standalone/cli/units.h"

namespace lookhaven::cli {

namespace {

std::string NameOf(store::MarkKind kind) {
    return kind == store::MarkKind::kAlert ? "alert" : "pos";
}

}  // namespace

const char* NameOf(store::MarkState state) {
    return state == store::MarkState::kPending ? "pending" : state == store::MarkState::kSaved ? "saved" : "missed";
}

Json::Value ToData(const store::Event& event) {
    Json::Value data;
    data["kind"] = "recorded";
    data["id"] = event.id;
    data["camera_id"] = event.camera_id;
    data["mount_id"] = event.mount_id;
    data["start"] = Json::Int64(event.start_s);
    data["end"] = Json::Int64(event.end_s);
    data["recording"] = event.recording;
    data["reason"] = event.reason;
    data["frame_count"] = event.frame_count;
    data["size_bytes"] = Json::Int64(event.size_bytes);
    data["video_type"] = static_cast<int>(event.video_type);
    data["audio_codec"] = event.audio_codec;
    data["width"] = event.width;
    data["height"] = event.height;
    data["path"] = event.path;
    data["archived"] = event.archived;
    data["demo"] = event.demo;
    return data;
}

Json::Value ToData(const store::Mark& mark) {
    Json::Value data;
    data["kind"] = NameOf(mark.kind);
    data["id"] = mark.id;
    data["camera_id"] = mark.camera_id;
    data["moment"] = Json::Int64(mark.moment_s);
    data["start"] = Json::Int64(mark.start_s);
    data["end"] = Json::Int64(mark.end_s);
    data["text"] = mark.text;
    data["state"] = NameOf(mark.state);
    data["mount_id"] = mark.mount_id;
    data["path"] = mark.path;
    data["demo"] = mark.demo;
    return data;
}

std::string Description(const store::Event& event) {
    const std::string reason = event.reason == base::kReasonAlarm        ? "an alarm"
                               : event.reason == base::kReasonContinuous ? "continuous recording"
                                                                         : "reason " + std::to_string(event.reason);
    return "Event " + std::to_string(event.id) + " of camera " + std::to_string(event.camera_id) + ", " + reason +
           (event.recording ? ", still recording" : "") + (event.archived ? ", archived" : "") +
           (event.demo ? ", made up for a trial" : "") + "\nfrom   " + FormatMoment(event.start_s) + "\nto     " +
           FormatMoment(event.end_s) + "\nvideo  " + VideoTypeName(event.video_type) + " " +
           std::to_string(event.width) + "x" + std::to_string(event.height) + ", " + std::to_string(event.frame_count) +
           " frames\naudio  " + (event.audio_codec.empty() ? "none" : event.audio_codec) + "\nsize   " +
           FormatSize(event.size_bytes) + "\n";
}

std::string Description(const store::Mark& mark) {
    return (mark.kind == store::MarkKind::kAlert ? "Alert " : "Sale ") + std::to_string(mark.id) + " of camera " +
           std::to_string(mark.camera_id) + ", " + NameOf(mark.state) + (mark.demo ? ", made up for a trial" : "") +
           "\nat     " + FormatMoment(mark.moment_s) + "\nfrom   " + FormatMoment(mark.start_s) + "\nto     " +
           FormatMoment(mark.end_s) + "\n" + (mark.text.empty() ? "" : mark.text + "\n");
}

}  // namespace lookhaven::cli
