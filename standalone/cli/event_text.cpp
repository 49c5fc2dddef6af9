// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/event_text.h"

#include <utility>

#include "standalone/base/codec_words.h"
#include "standalone/cli/camera_options.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

namespace {

std::string MomentText(const Json::Value& moment) {
    return FormatMoment(moment.asInt64());
}

std::string LengthText(const Json::Value& event) {
    return FormatDuration(event["end"].asInt64() - event["start"].asInt64());
}

std::string SizeText(const Json::Value& size) {
    return FormatSize(size.asInt64());
}

std::string StateText(const Json::Value& event) {
    std::string text;
    for (const auto& [member, state] : {std::pair{"recording", "recording"}, {"archived", "kept"}, {"demo", "demo"}}) {
        if (event[member].asBool()) {
            text += (text.empty() ? "" : " ") + std::string(state);
        }
    }
    return text;
}

// The first line, or that in which something was found, with what was found in brackets.
std::string LineOf(const Json::Value& mark) {
    for (const Json::Value& pieces : mark["found"]) {
        std::string line;
        for (Json::ArrayIndex i = 0; i < pieces.size(); ++i) {
            line += i % 2 == 0 ? pieces[i].asString() : '[' + pieces[i].asString() + ']';
        }
        if (pieces.size() > 1) {
            return line;
        }
    }
    const std::string text = mark["text"].asString();
    return text.substr(0, text.find('\n'));
}

// Empty for a mark made on the command line.
std::string ReporterText(const store::Mark& mark) {
    return mark.reporter.name.empty()
               ? ""
               : Concat("by     ", mark.reporter.name, ", ", FormatMoment(mark.reported_s), "\n");
}

constexpr Column kEventColumns[] = {{"id", "id"},
                                    {"camera", "camera_id"},
                                    {"start", "start", MomentText},
                                    {"length", "", LengthText},
                                    {"size", "size_bytes", SizeText},
                                    {"video", "video_type", VideoTypeText},
                                    {"audio", "audio_codec"},
                                    {"", "", StateText}};
constexpr Column kMarkColumns[] = {{"id", "id"},       {"camera", "camera_id"},        {"moment", "moment", MomentText},
                                   {"state", "state"}, {"reported by", "reported_by"}, {"text", "", LineOf}};

}  // namespace

Json::Value ToData(const store::Event& event) {
    return Object("kind", "recorded", "id", event.id, "camera_id", event.camera_id, "mount_id", event.mount_id, "start",
                  event.start_s, "end", event.end_s, "recording", event.recording, "reason", event.reason,
                  "frame_count", event.frame_count, "size_bytes", event.size_bytes, "video_type",
                  static_cast<int>(event.video_type), "audio_codec", event.audio_codec, "width", event.width, "height",
                  event.height, "path", event.path, "archived", event.kept, "demo", event.demo);
}

Json::Value ToData(const store::Mark& mark, const store::TextQuery& words) {
    Json::Value data = Object("kind", NameOf(store::MarkKindNames(), mark.kind), "id", mark.id, "camera_id",
                              mark.camera_id, "moment", mark.moment_s, "start", mark.start_s, "end", mark.end_s, "text",
                              mark.text, "state", NameOf(mark.state), "mount_id", mark.mount_id, "path", mark.path,
                              "demo", mark.demo, "reported_by", mark.reporter.name, "reported", mark.reported_s);
    if (!words.IsEmpty()) {
        data["found"] = Array(words.Mark(mark.text), [](const std::vector<std::string>& pieces) {
            return Array(pieces, [](const std::string& piece) { return Json::Value(piece); });
        });
    }
    return data;
}

std::string EventTable(const Json::Value& events) {
    return Table(kEventColumns, events);
}

std::string MarkTable(const Json::Value& marks) {
    return Table(kMarkColumns, marks);
}

std::string Description(const store::Event& event) {
    const std::string reason = event.reason == base::kReasonAlarm        ? "alarm"
                               : event.reason == base::kReasonContinuous ? "continuous recording"
                                                                         : Concat("reason ", event.reason);
    return Concat(
        "Event ", event.id, " of camera ", event.camera_id, ", ", reason, event.recording ? ", still recording" : "",
        event.kept ? ", kept" : "", event.demo ? ", generated" : "", "\nfrom   ", FormatMoment(event.start_s),
        "\nto     ", FormatMoment(event.end_s), "\nvideo  ", base::CodecTitle(event.video_type), " ", event.width, "x",
        event.height, ", ", event.frame_count, " frames\naudio  ",
        event.audio_codec.empty() ? "none" : event.audio_codec, "\nsize   ", FormatSize(event.size_bytes), "\n");
}

std::string Description(const store::KeepRecord& record) {
    return Concat("kept   by ", record.keeper.empty() ? "the command line" : record.keeper,
                  record.kept_s == 0 ? "" : ", " + FormatMoment(record.kept_s),
                  record.note.empty() ? "" : ": " + record.note, "\n");
}

std::string Description(const store::Mark& mark) {
    return Concat(mark.kind == store::MarkKind::kAlert ? "Alert " : "POS transaction ", mark.id, " of camera ",
                  mark.camera_id, ", ", NameOf(mark.state), mark.demo ? ", generated" : "", "\nat     ",
                  FormatMoment(mark.moment_s), "\nfrom   ", FormatMoment(mark.start_s), "\nto     ",
                  FormatMoment(mark.end_s), "\n", ReporterText(mark), mark.text, mark.text.empty() ? "" : "\n");
}

}  // namespace lookhaven::cli
