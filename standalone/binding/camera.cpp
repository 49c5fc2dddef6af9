// SPDX-License-Identifier: Apache-2.0
//
// Camera records and what their devices are able to do.
#include "platform/camera/camera.h"

#include <algorithm>
#include <charconv>
#include <filesystem>
#include <set>
#include <string_view>

#include "platform/camera/devcap.h"
#include "standalone/binding/camera_record.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/store/cameras.h"
#include "standalone/store/groups.h"
#include "standalone/store/settings.h"
#include "standalone/store/users.h"

namespace base = lookhaven::base;
namespace store = lookhaven::store;
using lookhaven::binding::IdSet;
using lookhaven::binding::OrFailure;
using lookhaven::binding::PlatformCamera;
using lookhaven::binding::RequestContext;

static_assert(static_cast<int>(base::Codec::kMjpeg) == CAM_VIDEO_MJPEG);
static_assert(static_cast<int>(base::Codec::kH264) == CAM_VIDEO_H264);
static_assert(static_cast<int>(base::Codec::kH265) == CAM_VIDEO_H265);
static_assert(store::kProfileCount == CAM_PROFILE_COUNT);

namespace {

constexpr int kNoStream = -1;
constexpr int kDefaultLoginPort = 8080;
constexpr unsigned int kPtzMoves = 1;  // of the PTZ abilities: the camera turns

}  // namespace

namespace lookhaven::binding {

Camera PlatformCamera(const store::Camera& from) {
    Camera to;
    to.m_Id = from.id;
    from.name.copy(to.m_szName, sizeof to.m_szName - 1);
    to.m_blEnabled = from.enabled;
    to.m_VideoType = static_cast<int>(from.video_type);
    to.m_LiveProfile = from.live_profile;
    for (int profile = 0; profile < CAM_PROFILE_COUNT; ++profile) {
        to.m_StreamNo[profile] = from.FindProfile(profile) != nullptr ? profile : kNoStream;
    }
    to.m_AudioType = from.audio ? CAM_AUDIO_SUPPORTED : CAM_AUDIO_NONE;
    to.m_DeviceType = from.ptz ? CAM_DEVICE_PTZ : CAM_DEVICE_FIXED;
    return to;
}

std::set<int> IdSet(std::string_view list) {
    std::set<int> ids;
    for (const char* at = list.data(); at < list.data() + list.size(); ++at) {
        int id = 0;
        const auto [end, error] = std::from_chars(at, list.data() + list.size(), id);
        if (error == std::errc()) {
            ids.insert(id);
            at = end;
        }
    }
    return ids;
}

}  // namespace lookhaven::binding

namespace {

struct Device : DPObjectBase {
    bool has_sound = false;
};

using SoundCall = MemFuncInterface<unsigned int, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT>;

struct SoundSupport : SoundCall {
    unsigned int operator()(DPObjectBase& target) override { return static_cast<Device&>(target).has_sound ? 1 : 0; }
};

}  // namespace

Camera::Camera()
    : m_Id(0),
      m_szName{},
      m_blEnabled(false),
      m_VideoType(0),
      m_LiveProfile(CAM_PROFILE_HIGH),
      m_StreamNo{kNoStream, kNoStream, kNoStream},
      m_AudioType(CAM_AUDIO_NONE),
      m_DeviceType(CAM_DEVICE_UNKNOWN) {}

int Camera::Load(int camId, int serverId, int archiveId) {
    if (serverId != 0 || archiveId != 0) {
        return -1;  // no recordings of paired hosts and no archives exist here
    }
    return OrFailure("Camera::Load", -1, [&] {
        const auto record = store::Cameras(RequestContext::Current().Records()).Find(camId);
        if (!record) {
            return -1;
        }
        *this = PlatformCamera(*record);
        return 0;
    });
}

CAM_PROFILE_TYPE Camera::GetLiveProfile() const {
    return static_cast<CAM_PROFILE_TYPE>(m_LiveProfile);
}

int Camera::GetUiStreamNo(CAM_PROFILE_TYPE profile) const {
    const int index = profile < 0 || profile >= CAM_PROFILE_COUNT || m_StreamNo[profile] == kNoStream
                          ? std::clamp(m_LiveProfile, 0, CAM_PROFILE_COUNT - 1)
                          : static_cast<int>(profile);
    return m_StreamNo[index];
}

std::string Camera::GetStoragePath() const {
    return OrFailure("Camera::GetStoragePath", std::string(), [&]() -> std::string {
        if (!lookhaven::binding::MayUse(m_Id, store::CameraAccess::kPlayback)) {
            return {};
        }
        const store::Mount* mount = RequestContext::Current().MountOf(m_Id);
        return mount == nullptr ? std::filesystem::path() : std::filesystem::path(mount->path) / std::to_string(m_Id);
    });
}

// An exception of the store ends the request: an empty list would say that the host has no cameras.
std::list<Camera> GetCamLocalList(bool onlyEnabled, const std::string& groupIds, const std::string& deniedIds, bool,
                                  bool) {
    std::list<Camera> cameras;
    store::Store& records = RequestContext::Current().Records();
    std::set<int> members;
    for (const int id : IdSet(groupIds)) {
        members.merge(store::Groups(records).Find(id).value_or(store::CameraGroup()).camera_ids);
    }
    const std::set<int> denied = IdSet(deniedIds);
    for (const store::Camera& record : store::Cameras(records).List()) {
        if (!denied.contains(record.id) && (record.enabled || !onlyEnabled) &&
            (groupIds.empty() || members.contains(record.id))) {
            cameras.push_back(PlatformCamera(record));
        }
    }
    return cameras;
}

int GetLoginPort() {
    return OrFailure("GetLoginPort", kDefaultLoginPort, [] {
        const auto text = store::Settings(RequestContext::Current().Records()).Find("login_port");
        const std::set<int> port = IdSet(text.value_or(""));
        return port.empty() || *port.begin() <= 0 ? kDefaultLoginPort : *port.begin();
    });
}

DevCapHandler::DevCapHandler() = default;
DevCapHandler::~DevCapHandler() = default;

int DevCapHandler::LoadByCam(const Camera& camera) {
    auto device = std::make_unique<Device>();
    device->has_sound = camera.m_AudioType != CAM_AUDIO_NONE;
    m_pDevice = std::move(device);
    m_pSoundSupport = std::make_unique<SoundSupport>();
    m_SoundSupport = {m_pDevice.get(), m_pSoundSupport.get(), "SoundSupport"};
    return 0;
}

unsigned int CamCapUtils::GetLiveStmPtzCapByUserName(const DevCapHandler&, const Camera& camera,
                                                     const std::string& userName) {
    return camera.m_DeviceType != CAM_DEVICE_PTZ ? 0 : OrFailure("GetLiveStmPtzCapByUserName", 0U, [&] {
        store::Users users(RequestContext::Current().Records());
        const auto user = users.FindByName(userName);
        return user && !users.DeniedCameras(user->id, store::CameraAccess::kLive).contains(camera.m_Id) ? kPtzMoves
                                                                                                        : 0U;
    });
}
