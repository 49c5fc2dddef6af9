// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/cameras.h"

#include <algorithm>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxNameBytes = 255;
constexpr std::size_t kMaxCredentialBytes = 255;
constexpr int kMaxFps = 120;

void RequireRule(bool holds, const char* rule) {
    if (!holds) {
        throw InvalidRecord(rule);
    }
}

bool IsWithin(int value, int last) {
    return value >= 0 && value <= last;
}

void RequireValid(const CameraProfile& profile) {
    RequireRule(IsWithin(profile.number, kProfileCount - 1), "a camera's profiles have the numbers 0, 1 and 2");
    RequireRule(
        IsSource(profile.source),
        "a camera's source is an address such as rtsp://host/path, holds no account or password, and has at most"
        " 2048 bytes");
    RequireRule(IsWithin(profile.width, base::kMaxSidePixels) && IsWithin(profile.height, base::kMaxSidePixels),
                "a picture is at most 8192 by 8192 pixels");
    RequireRule(IsWithin(profile.fps, kMaxFps), "a camera sends at most 120 frames per second");
}

void RequireValid(const Camera& camera) {
    RequireRule(!camera.name.empty() && IsPlainText(camera.name, kMaxNameBytes),
                "a camera's name is 1 to 255 bytes of UTF-8 without control characters");
    RequireRule(camera.max_age_s >= 0, "the maximum age of a camera's recordings is not below 0");
    RequireRule(base::IsVideo(camera.video_type), "a camera's video is MJPEG, H.264 or H.265");
    bool seen[kProfileCount] = {};
    for (const CameraProfile& profile : camera.profiles) {
        RequireValid(profile);
        RequireRule(!std::exchange(seen[profile.number], true), "a camera has one profile of each number");
    }
    RequireRule(camera.FindProfile(camera.live_profile) != nullptr,
                "the live view needs a profile that the camera has");
}

}  // namespace

template <>
struct Mapping<Camera> {
    static constexpr const char* kTable = "cameras";
    static constexpr const char* kColumns =
        "id, name, enabled, video_type, live_profile, ptz, audio, insecure, host_id, max_age";
    static auto Members(auto& camera) {
        return std::tie(camera.id, camera.name, camera.enabled, camera.video_type, camera.live_profile, camera.ptz,
                        camera.audio, camera.insecure, camera.host_id, camera.max_age_s);
    }
};

using ProfileRow = std::pair<int, CameraProfile>;

template <>
struct Mapping<ProfileRow> {
    static constexpr const char* kTable = "camera_profiles";
    static constexpr const char* kColumns = "camera_id, number, source, width, height, fps";
    static auto Members(auto& row) {
        auto& [camera_id, profile] = row;
        return std::tie(camera_id, profile.number, profile.source, profile.width, profile.height, profile.fps);
    }
};

template <>
struct Mapping<Credentials> {
    static auto Members(auto& credentials) { return std::tie(credentials.account, credentials.password); }
};

namespace {

void ReplaceProfiles(soci::session& sql, const Camera& camera) {
    Execute(sql, "delete from camera_profiles where camera_id = :id", camera.id);
    for (const CameraProfile& profile : camera.profiles) {
        Insert(sql, ProfileRow(camera.id, profile));
    }
}

// Cameras and profiles in one statement, so that they belong together.
template <typename... Parameter>
std::vector<Camera> FetchCameras(Connection& connection, const std::string& condition, const Parameter&... parameters) {
    std::vector<Camera> cameras;
    connection.Read([&](soci::session& sql) {
        Query<std::pair<Camera, ProfileRow>>(
            sql, kOnce,
            std::string("select ") + Mapping<Camera>::kColumns + ", " + Mapping<ProfileRow>::kColumns +
                " from cameras join camera_profiles on camera_id = id " + condition + " order by place, id, number",
            parameters...)
            .ForEach([&](const auto& row) {
                if (cameras.empty() || cameras.back().id != row.first.id) {
                    cameras.push_back(row.first);
                }
                cameras.back().profiles.push_back(row.second.second);
            });
    });
    return cameras;
}

}  // namespace

const CameraProfile* Camera::FindProfile(int number) const {
    const auto found = std::find_if(profiles.begin(), profiles.end(),
                                    [number](const CameraProfile& profile) { return profile.number == number; });
    return found == profiles.end() ? nullptr : &*found;
}

int Cameras::Add(const Camera& camera) {
    RequireValid(camera);
    return connection_.Write([&](soci::session& sql) {
        Camera added = camera;
        added.id = NextId(sql, "camera");
        Insert(sql, added);
        Execute(sql, "update cameras set place = id where id = :id", added.id);
        ReplaceProfiles(sql, added);
        RaiseRevision(sql);
        return added.id;
    });
}

void Cameras::Update(const Camera& camera) {
    RequireValid(camera);
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, camera.id);
        store::Update(sql, camera);
        ReplaceProfiles(sql, camera);
    });
}

void Cameras::SetVideoType(int id, base::Codec type) {
    if (const std::optional<Camera> camera = Find(id); camera && camera->video_type != type) {
        connection_.Write([&](soci::session& sql) {
            RaiseRevision(sql);
            Execute(sql, "update cameras set video_type = :type where id = :id", static_cast<int>(type), id);
        });
    }
}

void Cameras::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, id);
        Execute(sql, "delete from cameras where id = :id", id);
        Execute(sql, "delete from camera_ports where camera_id = :id", id);
    });
}

std::optional<Camera> Cameras::Find(int id) {
    std::vector<Camera> found = FetchCameras(connection_, "where id = :id", id);
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<Camera> Cameras::List() {
    return FetchCameras(connection_, "");
}

std::map<int, std::int64_t> Cameras::MaxAges() {
    return connection_.FetchAll<std::pair<int, std::int64_t>, std::map<int, std::int64_t>>(
        "select id, max_age from cameras where max_age > 0");
}

void Cameras::SetOrder(const std::vector<int>& ids) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        std::vector<int> given = ids;
        std::ranges::sort(given);
        RequireRule(given == FetchAll<int>(sql, "select id from cameras order by id"),
                    "an order names every camera, each once");
        for (int place = 1; const int id : ids) {
            Execute(sql, "update cameras set place = :place where id = :id", place++, id);
        }
    });
}

void Cameras::SetCredentials(int id, const std::optional<Credentials>& credentials) {
    RequireRule(!credentials || (IsPlainText(credentials->account, kMaxCredentialBytes) &&
                                 IsPlainText(credentials->password, kMaxCredentialBytes)),
                "a camera's account and password are at most 255 bytes of UTF-8 each, without control characters");
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, id);
        Execute(sql, "delete from camera_credentials where camera_id = :id", id);
        if (credentials) {
            Execute(sql,
                    "insert into camera_credentials (camera_id, account, password) values (:id, :account, :password)",
                    id, credentials->account, credentials->password);
        }
    });
}

std::optional<Credentials> Cameras::FindCredentials(int id) {
    return connection_.FetchOne<Credentials>("select account, password from camera_credentials where camera_id = :id",
                                             id);
}

}  // namespace lookhaven::store
