// SPDX-License-Identifier: Apache-2.0
//
// Cameras: what they are called, where their streams come from, what they can do.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "standalone/base/video.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

constexpr int kProfileCount = 3;

// One stream of a camera; its number is that of the live stream too.
struct CameraProfile {
    int number = 0;      // 0 … kProfileCount - 1
    std::string source;  // such as "rtsp://host/path", without account and password
    int width = 0;       // as asked for; 0 = as the source has it
    int height = 0;
    int fps = 0;

    friend bool operator==(const CameraProfile&, const CameraProfile&) = default;
};

struct Camera {
    int id = 0;        // from 1, never used twice, since recordings carry it
    std::string name;  // UTF-8, 1 to 255 bytes
    bool enabled = true;
    base::Codec video_type = base::Codec::kMjpeg;
    int live_profile = 0;  // the number of the profile that the live view shows
    bool ptz = false;
    bool audio = false;
    bool insecure = false;                // its HTTPS certificate is not verified
    std::vector<CameraProfile> profiles;  // by number, at least the live one
    int host_id = 0;                      // the host of store/hosts.h that records it; 0: whichever has room
    std::int64_t max_age_s = 0;           // retention removes recordings that are older, on any mount; 0: no limit

    // Null when the camera lacks that profile.
    const CameraProfile* FindProfile(int number) const;

    friend bool operator==(const Camera&, const Camera&) = default;
};

// The recorder's login at the camera.
struct Credentials {
    std::string account;
    std::string password;
};

// Invariants    (1) Every change raises Settings::Revision() in the same transaction.
//               (2) Credentials come out of FindCredentials alone, never with the record.
class Cameras {
  public:
    // The store must outlive this object.
    explicit Cameras(Store& store) : connection_(store.connection()) {}

    // Stores the record under a new id, which it returns; camera.id is ignored. Any kind of source may be stored:
    // whether this program knows how to open it is for the caller to check. Throws InvalidRecord.
    int Add(const Camera& camera);
    // Replaces the record of camera.id. Throws InvalidRecord or NotFound.
    void Update(const Camera& camera);
    // What the camera was found to send. Nothing happens for an unknown camera, or when it is stored so.
    void SetVideoType(int id, base::Codec type);
    // Removes record and credentials; recordings and denials stay. Throws NotFound.
    void Remove(int id);

    std::optional<Camera> Find(int id);
    std::vector<Camera> List();  // in their order; a new camera comes last
    // By camera, those without one left out.
    std::map<int, std::int64_t> MaxAges();
    // ids: all cameras, each once. Throws InvalidRecord.
    void SetOrder(const std::vector<int>& ids);

    // nullopt removes them. Throws InvalidRecord, or NotFound for an unknown camera.
    void SetCredentials(int id, const std::optional<Credentials>& credentials);
    std::optional<Credentials> FindCredentials(int id);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
