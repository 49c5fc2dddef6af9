// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Event: report what happened at a camera, list it, walk through it, keep it, stream and download its footage.
#include "standalone/api/own_apis.h"

#include <algorithm>
#include <limits>
#include <optional>

#include "platform/camera/camgroup.h"
#include "platform/recording/eventsearch.h"
#include "standalone/api/download.h"
#include "standalone/api/event_json.h"
#include "standalone/api/event_kinds.h"
#include "standalone/api/export.h"
#include "standalone/api/footage.h"
#include "standalone/api/keep.h"
#include "standalone/api/stream.h"
#include "standalone/api/watch.h"
#include "standalone/base/clock.h"
#include "standalone/base/moment.h"
#include "standalone/binding/rights.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/outline.h"
#include "standalone/store/settings.h"
#include "standalone/store/users.h"

namespace lookhaven::api {

namespace {

constexpr std::int64_t kMaxAheadSeconds = 300;  // a POS terminal's clock may be off
constexpr int kMaxListed = 10'000;
constexpr int kMaxOffset = 100'000;
constexpr int kMaxSteps = 20'000;
constexpr std::int64_t kMaxCameraSteps = 400'000;  // all cameras' steps together, each of which may be a bar
constexpr std::int64_t kMaxStepSeconds = 86'400;
constexpr std::size_t kMaxCameras = 1'000;  // that a call may name

// One text, or a list of lines.
std::string TextOf(const Json::Value& text) {
    if (!text.isArray()) {
        return text.asString();
    }
    std::string joined;
    for (const Json::Value& line : text) {
        joined += (joined.empty() ? "" : "\n") + line.asString();
    }
    return joined;
}

template <typename AnyEvent>
std::string AnswerVisible(const Call& call, const std::optional<AnyEvent>& event) {
    RequireVisible(event);
    return SuccessAnswer(DescribeWithKeeping(call.Records(), *event));
}

std::string Get(const Call& call) {
    const std::optional<store::MarkKind> kind = KindOf(call);
    const int id = call.Parameter("event").asInt();
    return kind ? AnswerVisible(call, store::Marks(call.Records()).Find(*kind, id))
                : AnswerVisible(call, store::Events(call.Records()).Find(id));
}

// The caller, who may report.
store::Reporter RequireReporter(const Call& call, store::MarkKind kind) {
    if (call.token) {
        if (!call.token->MayReport(kind)) {
            throw Failure(403, "this access token may not report events of this kind");
        }
        return call.token->AsReporter();
    }
    const auto user = store::Users(call.Records()).Find(static_cast<int>(call.context.Caller()));
    if (!user || (!user->may_mark_as_viewer && !binding::IsManager())) {
        throw Failure(403, "this account may not report events");
    }
    return {user->id, user->name};
}

bool MayReportAt(const Call& call, int camera) {
    return call.token ? call.token->camera_ids.contains(camera)
                      : binding::MayUse(camera, store::CameraAccess::kPlayback);
}

// When it happened: seconds, or a date and time that say their zone.
std::int64_t StartOf(const Call& call, std::int64_t now_s) {
    const Json::Value& start = call.Parameter("start");
    if (!start.isString()) {
        return call.NumberOr("start", now_s);
    }
    const std::optional<base::Moment> moment = base::ParseMoment(start.asString());
    if (!moment || !moment->has_zone) {
        throw Failure(400, "start must be seconds or look like 2026-03-01T08:15:30Z or 2026-03-01T09:15:30+01:00");
    }
    return moment->utc_s;
}

// A report is evidence, so its time must be one of which there may be footage.
void RequirePlausible(const Call& call, int camera, std::int64_t start_s, std::int64_t now_s) {
    if (start_s > now_s + kMaxAheadSeconds) {
        throw Failure(400, "start lies in the future");
    }
    const std::vector<store::Event> first = store::Events(call.Records()).List({.camera_ids = {camera}, .limit = 1});
    const std::int64_t earliest_s = first.empty() ? now_s : first.front().start_s;
    if (start_s < std::min(earliest_s, now_s - kMaxAheadSeconds)) {
        throw Failure(400, "start lies before the first footage of the camera");
    }
}

std::string Report(const Call& call) {
    const auto kind = KindOf(call);
    if (!kind) {
        throw Failure(400, "kind must be alert or pos");
    }
    const int camera = static_cast<int>(call.Parameter("camera").asInt());
    const std::int64_t now_s = base::WallSeconds();
    const std::int64_t start_s = StartOf(call, now_s);
    const std::int64_t length_s = call.NumberOr("length", 0);
    if (camera < 1 || start_s < 1 || length_s < 0 || length_s > store::kMaxMarkSeconds) {
        throw Failure(400, "camera, start or length is out of its bounds");
    }
    const store::Reporter reporter = RequireReporter(call, *kind);
    if (!MayReportAt(call, camera) || !store::Cameras(call.Records()).Find(camera)) {
        throw Failure(404, kNoSuchCamera);
    }
    RequirePlausible(call, camera, start_s, now_s);
    const std::int64_t max_per_day = store::Settings(call.Records()).NumberOr("marks_per_day", store::kMarksPerDay);
    try {
        return SuccessAnswer(Describe(
            store::Marks(call.Records())
                .Add(*kind, camera, start_s, length_s, TextOf(call.Parameter("text")), reporter, now_s, max_per_day)));
    } catch (const store::TooManyMarks& error) {
        throw Failure(429, error.what());
    }
}

// The cameras asked for, or all, without those that the caller may not play back. Which these are must not decide
// whether more than max_named are too many.
std::set<int> CamerasOf(const Call& call, std::size_t max_named = kMaxCameras) {
    const Json::Value asked = call.Parameter("cameralists");
    std::set<int> ids;
    if (!asked.isNull()) {
        const std::list<int> numbers = String2IntList(asked.asString(), ",");
        ids.insert(numbers.begin(), numbers.end());
        if (ids.size() > max_named) {
            throw Failure(400, "cameralists names more than " + std::to_string(max_named) + " cameras");
        }
        const std::set<int> denied = binding::DeniedCameras(store::CameraAccess::kPlayback);
        std::erase_if(ids, [&denied](int id) { return denied.contains(id); });
        return ids;
    }
    for (const auto& [id, camera] : GetCamMountMap(0, "", true)) {
        ids.insert(id);
    }
    return ids;
}

// What the filters of marks and of recorded events have in common.
template <typename Filter>
Filter FilterOf(const Call& call) {
    Filter filter;
    filter.camera_ids = CamerasOf(call);
    filter.begin_s = call.NumberOr("from", 0);
    filter.end_s = call.NumberOr("to", base::WallSeconds() + kMaxAheadSeconds);
    filter.newest_first = true;
    const std::int64_t offset = call.NumberOr("offset", 0);
    const std::int64_t limit = call.NumberOr("limit", 1000);
    if (filter.end_s <= filter.begin_s || offset < 0 || offset > kMaxOffset || limit < 1 || limit > kMaxListed) {
        throw Failure(400, "from, to, offset or limit is out of its bounds");
    }
    filter.offset = static_cast<int>(offset);
    filter.limit = static_cast<int>(limit);
    return filter;
}

std::string List(const Call& call) {
    Json::Value data;
    data["event"] = Json::arrayValue;
    const Json::Value& kept = call.Parameter("kept");
    const Json::Value& text = call.Parameter("text");
    if (!kept.isNull() && kept.asBool()) {
        if (!text.isNull()) {
            throw Failure(400, "recorded events have no text to look for: leave out kept or text");
        }
        auto filter = FilterOf<store::EventFilter>(call);
        filter.kept_only = true;
        data["event"] = DescribeWithKeeping(call.Records(), store::Events(call.Records()).List(filter));
        return SuccessAnswer(data);
    }
    auto filter = FilterOf<store::MarkFilter>(call);
    filter.kind = KindOf(call);
    if (!text.isNull()) {
        filter.words = store::TextQuery(text.asString());
    }
    for (const store::Mark& mark : store::Marks(call.Records()).List(filter)) {
        data["event"].append(Describe(mark, filter.words));
    }
    return SuccessAnswer(data);
}

Json::Value MomentsOf(const std::vector<std::int64_t>& moments) {
    Json::Value json(Json::arrayValue);
    for (const std::int64_t moment_s : moments) {
        json.append(Json::Int64{moment_s});
    }
    return json;
}

Json::Value BarsOf(const std::vector<store::Bar>& bars) {
    Json::Value json(Json::arrayValue);
    for (const store::Bar& bar : bars) {
        json.append(MomentsOf({bar.start_s, bar.end_s}));
    }
    return json;
}

std::string Outline(const Call& call) {
    const std::int64_t begin_s = call.NumberOr("from", 0);
    const std::int64_t end_s = call.NumberOr("to", 0);
    const std::int64_t step_s = call.NumberOr("step", 0);
    if (begin_s < 0 || end_s <= begin_s || step_s < 1 || step_s > kMaxStepSeconds ||
        (end_s - begin_s) / step_s > kMaxSteps) {
        throw Failure(400, "from, to or step is out of its bounds");
    }
    const auto max_cameras = static_cast<std::size_t>(
        std::min<std::int64_t>(kMaxCameras, kMaxCameraSteps / std::max<std::int64_t>(1, (end_s - begin_s) / step_s)));
    const std::set<int> cameras = CamerasOf(call, max_cameras);
    if (cameras.size() > max_cameras) {
        throw Failure(400, "that is too much for one answer: name fewer cameras, or ask for longer steps");
    }
    Json::Value data;
    data["camera"] = Json::arrayValue;
    for (const int camera : cameras) {
        const store::Outline outline = store::OutlineOf(call.Records(), camera, begin_s, end_s, step_s);
        if (outline.IsEmpty()) {
            continue;  // like a camera that the caller may not see, or that does not exist
        }
        Json::Value& json = data["camera"].append(Json::objectValue);
        json["camera_id"] = camera;
        json["continuous"] = BarsOf(outline.continuous);
        json["alarm"] = BarsOf(outline.alarm);
        json["alert"] = MomentsOf(outline.alerts);
        json["pos"] = MomentsOf(outline.transactions);
    }
    return SuccessAnswer(data);
}

std::string Next(const Call& call) {
    const EventKinds kinds(call.Parameter("kinds"));
    const Json::Value& before = call.Parameter("before");
    store::Step step{.camera_ids = CamerasOf(call)};
    step.start_s = call.NumberOr("time", base::WallSeconds());
    step.backwards = !before.isNull() && before.asBool();
    step.id = call.Parameter("event").isNull() ? (step.backwards ? 0 : std::numeric_limits<int>::max())
                                               : call.Parameter("event").asInt();
    const auto event =
        kinds.continuous || kinds.alarm ? store::Events(call.Records()).Next(step, kinds.Reasons()) : std::nullopt;
    const auto mark =
        kinds.alert || kinds.pos ? store::Marks(call.Records()).Next(step, kinds.OnlyMark()) : std::nullopt;
    Json::Value data;
    data["event"] = Json::nullValue;
    if (event && (!mark || step.IsNearer(*event, *mark))) {
        data["event"] = Describe(*event);
    } else if (mark) {
        data["event"] = Describe(*mark);
    }
    return SuccessAnswer(data);
}

constexpr Method kMethods[] = {{"Mark", Report, Method::Accepts::kPostOnly},
                               {"List", List},
                               {"Outline", Outline},
                               {"Watch", Watch},
                               {"Get", Get},
                               {"Next", Next},
                               {"Frame", FrameAtTime},
                               {"Keep", Keep, Method::Accepts::kPostOnly},
                               {"Download", Download},
                               {"Stream", Stream},
                               {"PlanExport", PlanExport},
                               {"Export", Export}};

}  // namespace

const OwnApi kEventApi{"VEXO.Event", kMethods};

}  // namespace lookhaven::api
