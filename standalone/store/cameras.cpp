// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/cameras.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxNameBytes = 255;
constexpr std::size_t kMaxCredentialBytes = 255;
constexpr int kMaxFps = 120;

void Require(bool holds, const char* rule) {
    if (!holds) {
        throw InvalidRecord(rule);
    }
}

bool IsWithin(int value, int last) {
    return value >= 0 && value <= last;
}

void RequireProfile(const CameraProfile& profile) {
    Require(IsWithin(profile.number, kProfileCount - 1), "a camera's profiles have the numbers 0, 1 and 2");
    Require(IsSource(profile.source),
            "a camera's source begins with rtsp://, http://, https://, file: or test:, holds no"
            " account or password, and has at most 2048 bytes");
    Require(IsWithin(profile.width, base::kMaxSidePixels) && IsWithin(profile.height, base::kMaxSidePixels),
            "a picture is at most 8192 by 8192 pixels");
    Require(IsWithin(profile.fps, kMaxFps), "a camera sends at most 120 frames per second");
}

void RequireCamera(const Camera& camera) {
    Require(!camera.name.empty() && IsPlainText(camera.name, kMaxNameBytes),
            "a camera's name is 1 to 255 bytes of UTF-8 without control characters");
    Require(base::IsVideo(camera.video_type), "a camera's video is MJPEG, H.264 or H.265");
    bool seen[kProfileCount] = {};
    for (const CameraProfile& profile : camera.profiles) {
        RequireProfile(profile);
        Require(!std::exchange(seen[profile.number], true), "a camera has one profile of each number");
    }
    Require(camera.FindProfile(camera.live_profile) != nullptr, "the live view needs a profile that the camera has");
}

void Insert(soci::session& sql, int id, const Camera& camera) {
    const int enabled = camera.enabled;
    const int type = static_cast<int>(camera.video_type);
    const int ptz = camera.ptz;
    const int audio = camera.audio;
    sql << "insert into cameras (id, name, enabled, video_type, live_profile, ptz, audio)"
           " values (:id, :name, :enabled, :type, :live, :ptz, :audio)"
           " on conflict (id) do update set name = excluded.name, enabled = excluded.enabled,"
           " video_type = excluded.video_type, live_profile = excluded.live_profile, ptz = excluded.ptz,"
           " audio = excluded.audio",
        soci::use(id, "id"), soci::use(camera.name, "name"), soci::use(enabled, "enabled"), soci::use(type, "type"),
        soci::use(camera.live_profile, "live"), soci::use(ptz, "ptz"), soci::use(audio, "audio");
    sql << "delete from camera_profiles where camera_id = :id", soci::use(id, "id");
    for (const CameraProfile& profile : camera.profiles) {
        sql << "insert into camera_profiles (camera_id, number, source, width, height, fps)"
               " values (:id, :number, :source, :width, :height, :fps)",
            soci::use(id, "id"), soci::use(profile.number, "number"), soci::use(profile.source, "source"),
            soci::use(profile.width, "width"), soci::use(profile.height, "height"), soci::use(profile.fps, "fps");
    }
}

// The cameras of ids first to last; cameras and profiles in one statement, so that they belong together.
std::vector<Camera> Fetch(soci::session& sql, int first, int last) {
    Camera camera;
    CameraProfile profile;
    int enabled = 0;
    int type = 0;
    int ptz = 0;
    int audio = 0;
    soci::statement rows =
        (sql.prepare << "select id, name, enabled, video_type, live_profile, ptz, audio, number, source, width, height,"
                        " fps from cameras join camera_profiles on camera_id = id"
                        " where id >= :first and id <= :last order by id, number",
         soci::use(first, "first"), soci::use(last, "last"), soci::into(camera.id), soci::into(camera.name),
         soci::into(enabled), soci::into(type), soci::into(camera.live_profile), soci::into(ptz), soci::into(audio),
         soci::into(profile.number), soci::into(profile.source), soci::into(profile.width), soci::into(profile.height),
         soci::into(profile.fps));
    rows.execute();
    std::vector<Camera> cameras;
    while (rows.fetch()) {
        if (cameras.empty() || cameras.back().id != camera.id) {
            camera.enabled = enabled != 0;
            camera.video_type = static_cast<base::Codec>(type);
            camera.ptz = ptz != 0;
            camera.audio = audio != 0;
            cameras.push_back(camera);
        }
        cameras.back().profiles.push_back(profile);
    }
    return cameras;
}

}  // namespace

const CameraProfile* Camera::FindProfile(int number) const {
    const auto found = std::find_if(profiles.begin(), profiles.end(),
                                    [number](const CameraProfile& profile) { return profile.number == number; });
    return found == profiles.end() ? nullptr : &*found;
}

int Cameras::Add(const Camera& camera) {
    RequireCamera(camera);
    return connection_.Write([&](soci::session& sql) {
        const int id = NextId(sql, "camera");
        Insert(sql, id, camera);
        RaiseRevision(sql);
        return id;
    });
}

void Cameras::Update(const Camera& camera) {
    RequireCamera(camera);
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, camera.id);
        Insert(sql, camera.id, camera);
    });
}

void Cameras::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, id);
        sql << "delete from cameras where id = :id", soci::use(id, "id");
        sql << "delete from camera_ports where camera_id = :id", soci::use(id, "id");
    });
}

std::optional<Camera> Cameras::Find(int id) {
    std::vector<Camera> found = connection_.Read([&](soci::session& sql) { return Fetch(sql, id, id); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<Camera> Cameras::List() {
    return connection_.Read([](soci::session& sql) { return Fetch(sql, 1, std::numeric_limits<int>::max()); });
}

void Cameras::SetCredentials(int id, const std::optional<Credentials>& credentials) {
    Require(!credentials || (IsPlainText(credentials->account, kMaxCredentialBytes) &&
                             IsPlainText(credentials->password, kMaxCredentialBytes)),
            "a camera's account and password are at most 255 bytes of UTF-8 each, without control characters");
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireCameraRow(sql, id);
        sql << "delete from camera_credentials where camera_id = :id", soci::use(id, "id");
        if (credentials) {
            sql << "insert into camera_credentials (camera_id, account, password) values (:id, :account, :password)",
                soci::use(id, "id"), soci::use(credentials->account, "account"),
                soci::use(credentials->password, "password");
        }
    });
}

std::optional<Credentials> Cameras::FindCredentials(int id) {
    return connection_.Read([&](soci::session& sql) {
        Credentials found;
        sql << "select account, password from camera_credentials where camera_id = :id", soci::use(id, "id"),
            soci::into(found.account), soci::into(found.password);
        return sql.got_data() ? std::optional(found) : std::nullopt;
    });
}

}  // namespace lookhaven::store
