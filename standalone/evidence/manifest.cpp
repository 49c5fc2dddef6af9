// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/manifest.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>

#include "standalone/base/clock.h"
#include "standalone/base/host_name.h"
#include "standalone/base/json_text.h"
#include "standalone/base/sha256.h"

namespace lookhaven::evidence {

namespace {

Json::Value MomentOf(const Plan& plan, std::int64_t wall_ms) {
    Json::Value moment;
    moment["utc"] = base::FormatUtc(wall_ms);
    moment["local"] = LocalTime(wall_ms, plan.request.utc_offset_min);
    return moment;
}

Json::Value Describe(const Plan& plan, const File& file) {
    const archive::IndexHeader& format = file.parts.front().header;
    Json::Value json;
    json["name"] = file.name;
    json["size_bytes"] = Json::Int64{file.size_bytes};
    json["video"] = format.codec;
    json["sound"] = file.HasSound() ? format.audio_codec : "";
    json["first_frame"] = MomentOf(plan, file.parts.front().FirstWallMs());
    json["last_frame"] = MomentOf(plan, file.parts.back().LastWallMs());
    return json;
}

Json::Value SpansJson(const Plan& plan, const std::vector<archive::TimeSpan>& spans) {
    Json::Value json(Json::arrayValue);
    for (const archive::TimeSpan& span : spans) {
        Json::Value each;
        each["begin"] = MomentOf(plan, span.begin_ms);
        each["end"] = MomentOf(plan, span.end_ms);
        json.append(each);
    }
    return json;
}

// The manifest's text, before it is padded to its size.
std::string TextOf(const Plan& plan, std::span<const WrittenFile> written) {
    Json::Value json;
    json["format"] = kManifestFormat;
    json["exported"] = MomentOf(plan, plan.request.now_ms);
    json["exported"]["by"] = plan.request.exporter;
    json["exported"]["host"] = base::OwnHostName();
    json["begin"] = MomentOf(plan, plan.request.span.begin_ms);
    json["end"] = MomentOf(plan, plan.request.span.end_ms);
    json["camera"] = CamerasOf(plan);
    auto next = written.begin();
    for (Json::Value& camera : json["camera"]) {
        for (Json::Value& file : camera["file"]) {
            file["sha256"] = next->sha256;
            file["missing"] = SpansJson(plan, next->missing);
            ++next;
        }
    }
    return base::IndentedJson(json) + '\n';
}

}  // namespace

Json::Value CamerasOf(const Plan& plan) {
    Json::Value cameras(Json::arrayValue);
    for (const Camera& camera : plan.cameras) {
        Json::Value json;
        json["id"] = camera.id;
        json["name"] = camera.name;
        json["file"] = Json::arrayValue;
        for (const File& file : camera.files) {
            json["file"].append(Describe(plan, file));
        }
        json["gap"] = SpansJson(plan, camera.gaps);
        cameras.append(json);
    }
    return cameras;
}

// Spaces and a line break at the end are where what is missing would be.
std::string ManifestOf(const Plan& plan, std::span<const WrittenFile> written) {
    std::string text = TextOf(plan, written);
    text.resize(static_cast<std::size_t>(ManifestBytes(plan)) - 1, ' ');
    return text + '\n';
}

std::int64_t ManifestBytes(const Plan& plan) {
    std::vector<WrittenFile> longest;
    for (const Camera& camera : plan.cameras) {
        for (const File& file : camera.files) {
            const auto spans = static_cast<std::size_t>(std::min(kMaxMissingSpans, std::ssize(file.parts)));
            longest.push_back(
                {std::string(base::kSha256Digits, '0'), std::vector<archive::TimeSpan>(spans, plan.request.span)});
        }
    }
    return std::ssize(TextOf(plan, longest)) + 1;
}

std::string LocalTime(std::int64_t wall_ms, int utc_offset_min) {
    std::array<char, 16> zone{};
    const int minutes = std::abs(utc_offset_min);
    std::snprintf(zone.data(), zone.size(), "%c%02d:%02d", utc_offset_min < 0 ? '-' : '+', minutes / 60, minutes % 60);
    std::string time = base::FormatUtc(wall_ms + std::int64_t{60'000} * utc_offset_min);
    time.pop_back();  // the Z
    return time + zone.data();
}

}  // namespace lookhaven::evidence
