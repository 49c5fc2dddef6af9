// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/export.h"

#include <algorithm>
#include <list>
#include <map>
#include <set>
#include <string>
#include <utility>

#include <unistd.h>

#include "platform/recording/eventsearch.h"
#include "standalone/api/attachment.h"
#include "standalone/api/decoder_sandbox.h"
#include "standalone/base/clock.h"
#include "standalone/base/io.h"
#include "standalone/binding/rights.h"
#include "standalone/control/flush_request.h"
#include "standalone/evidence/manifest.h"
#include "standalone/evidence/signing_key.h"
#include "standalone/evidence/write.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"
#include "standalone/store/users.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxCameras = 16;
constexpr std::int64_t kMaxSpanSeconds = 86'400;
constexpr std::size_t kMaxRecordings = 20'000;
constexpr std::size_t kMaxExportsOfUser = 2;
constexpr std::size_t kMaxExports = 6;
constexpr std::int64_t kMaxBytes = std::int64_t{256} << 30;

std::set<int> CamerasOf(const Call& call) {
    const std::list<int> numbers = String2IntList(call.Parameter("cameralists").asString(), ",");
    std::set<int> ids(numbers.begin(), numbers.end());
    if (ids.empty() || ids.size() > kMaxCameras) {
        throw Failure(400, "cameralists names 1 to " + std::to_string(kMaxCameras) + " cameras");
    }
    return ids;
}

archive::TimeSpan SpanOf(const Call& call, std::int64_t now_s) {
    const std::int64_t from_s = call.NumberOr("from", 0);
    const std::int64_t to_s = call.NumberOr("to", now_s);
    if (from_s < 1 || to_s > now_s + kMaxSpanSeconds || to_s <= from_s || to_s - from_s > kMaxSpanSeconds) {
        throw Failure(400, "from and to are at most a day apart, and not far ahead");
    }
    return {from_s * 1000, to_s * 1000};
}

// The camera's recordings; asks the recorder for the latest of one that grows. left: how many more there may be.
evidence::CameraFootage FootageOf(const Call& call, int id, const archive::TimeSpan& span,
                                  const std::map<int, std::string>& mounts, std::size_t& left) {
    const auto camera = store::Cameras(call.Records()).Find(id);
    const std::vector<store::Event> events = store::Events(call.Records())
                                                 .List({.camera_ids = {id},
                                                        .begin_s = span.begin_ms / 1000,
                                                        .end_s = span.end_ms / 1000,
                                                        .limit = static_cast<int>(left) + 1});
    if (!binding::MayUse(id, store::CameraAccess::kExport) || (!camera && events.empty())) {
        throw Failure(404, kNoSuchCamera);
    }
    if (events.size() > left) {
        throw Failure(400, "these are more than " + std::to_string(kMaxRecordings) +
                               " recordings: choose a shorter span or fewer cameras");
    }
    left -= events.size();
    evidence::CameraFootage footage{.id = id, .name = camera ? camera->name : "Camera " + std::to_string(id)};
    footage.with_sound = binding::MayUse(id, store::CameraAccess::kAudio);
    for (const store::Event& event : events) {
        const auto mount = mounts.find(event.mount_id);
        if (event.demo || mount == mounts.end()) {
            continue;
        }
        footage.recordings.push_back(std::filesystem::path(mount->second) / event.path);
        if (event.recording && span.end_ms >= event.end_s * 1000) {
            control::FlushRequests(call.context.Installation()).Ask(event.id);
        }
    }
    return footage;
}

evidence::Request RequestOf(const Call& call) {
    const std::int64_t now_s = base::WallSeconds();
    const std::set<int> ids = CamerasOf(call);
    evidence::Request request{.span = SpanOf(call, now_s), .now_ms = now_s * 1000};
    request.utc_offset_min = UtcOffset(call);
    request.names_in_utc = call.Parameter("utc_offset_min").isNull();
    request.as_archive = !call.Parameter("archive").isNull() && call.Parameter("archive").asBool();
    const auto user = store::Users(call.Records()).Find(static_cast<int>(call.context.Caller()));
    request.exporter = user ? user->name : "";
    std::map<int, std::string> mounts;
    for (const store::Mount& mount : store::Mounts(call.Records()).List()) {
        mounts.emplace(mount.id, mount.path);
    }
    std::size_t left = kMaxRecordings;
    for (const int id : ids) {
        request.cameras.push_back(FootageOf(call, id, request.span, mounts, left));
    }
    return request;
}

void OccupyExport(const Call& call) {
    switch (call.slots.BeginExport(call.slot, kMaxExportsOfUser, kMaxExports)) {
    case control::QuotaResult::kGranted:
        return;
    case control::QuotaResult::kTooManyOfUser:
        throw Failure(429,
                      "this account is exporting " + std::to_string(kMaxExportsOfUser) +
                          " files already: wait until one is complete",
                      http::kRetrySoonSeconds);
    case control::QuotaResult::kTooMany:
        throw Failure(503, "too many exports are running; try again in a moment", http::kRetrySoonSeconds);
    }
}

void LogExport(const Call& call, const evidence::Request& request) {
    std::string cameras;
    for (const evidence::CameraFootage& camera : request.cameras) {
        cameras += (cameras.empty() ? "camera " : ", ") + std::to_string(camera.id);
    }
    LogFootageSent(call, "an export", cameras, request.span);
}

// Confines the process: what reads on from here has been sent by a camera.
evidence::Plan PlanOf(const Call& call, const media::RemuxLibrary& remux) {
    evidence::Request request = RequestOf(call);
    call.context.CloseRecords();
    call.slots.KeepOnly(call.slot);
    const base::Installation& installation = call.context.Installation();
    EnterPlaybackSandbox(installation, PlaybackFilter(installation.StoreUrl()));
    evidence::Plan plan = evidence::MakePlan(std::move(request), remux);
    if (std::ranges::all_of(plan.cameras, [](const auto& camera) { return camera.files.empty(); })) {
        throw Failure(404, "nothing of that time is recorded");
    }
    if (plan.size_bytes > kMaxBytes) {
        throw Failure(400, "this is more than can be exported at once");
    }
    return plan;
}

}  // namespace

std::string PlanExport(const Call& call) {
    const evidence::Plan plan = PlanOf(call, media::LoadRemuxLibrary());
    Json::Value data;
    data["name"] = plan.name;
    data["size_bytes"] = Json::Int64{plan.size_bytes};
    data["camera"] = evidence::CamerasOf(plan);
    return SuccessAnswer(data);
}

std::set<int> MountsOfExport(const Call& call) {
    const std::set<int> cameras = CamerasOf(call);
    const archive::TimeSpan span = SpanOf(call, base::WallSeconds());
    std::set<int> mounts;
    if (std::ranges::all_of(cameras, [](int id) { return binding::MayUse(id, store::CameraAccess::kExport); })) {
        store::Events(call.Records())
            .Visit({.camera_ids = cameras, .begin_s = span.begin_ms / 1000, .end_s = span.end_ms / 1000},
                   [&mounts](const store::Event& event) { mounts.insert(event.mount_id); });
    }
    return mounts;
}

std::string Export(const Call& call) {
    const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
    const std::filesystem::path key = call.context.Installation().SigningKeyFile();
    evidence::LoadSignatureLibrary();
    OccupyExport(call);
    evidence::RequireSigningKey(key);  // before any footage is read
    const evidence::Plan plan = PlanOf(call, remux);
    LogExport(call, plan.request);
    call.context.NoteStream();  // the plan has the limits of a search
    SendAttachmentHead(plan.content_type, plan.name, plan.size_bytes);
    SendUntilClientLeaves([&] {
        evidence::Write(
            plan, remux, [](auto bytes) { return base::WriteAll(STDOUT_FILENO, bytes.data(), bytes.size()); },
            [&key](std::string_view manifest) { return evidence::SignBy(key, manifest); });
    });
    return "";
}

}  // namespace lookhaven::api
