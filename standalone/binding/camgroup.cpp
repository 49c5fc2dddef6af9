// SPDX-License-Identifier: Apache-2.0
//
// Sets of cameras to play back from, without those that are denied to the caller.
#include "platform/camera/camgroup.h"

#include "standalone/binding/camera_record.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/store/events.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"

namespace store = lookhaven::store;
using lookhaven::binding::DeniedCameras;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

namespace {

// A camera that was removed leaves its id and its recordings.
Camera RemovedCamera(int id) {
    Camera camera;
    camera.m_Id = id;
    return camera;
}

std::map<int, Camera> RecordsOf(const std::set<int>& ids, bool with_removed) {
    std::map<int, Camera> cameras;
    for (const store::Camera& record : store::Cameras(RequestContext::Current().Records()).List()) {
        if (ids.contains(record.id)) {
            cameras.emplace(record.id, lookhaven::binding::PlatformCamera(record));
        }
    }
    for (const int id : ids) {
        if (with_removed && !cameras.contains(id)) {
            cameras.emplace(id, RemovedCamera(id));
        }
    }
    return cameras;
}

std::set<int> Without(std::set<int> ids, const std::set<int>& denied) {
    std::erase_if(ids, [&denied](int id) { return denied.contains(id); });
    return ids;
}

// The cameras whose plan names the mount.
std::set<int> RecordingOn(store::Store& records, int mount_id) {
    store::Mounts mounts(records);
    const auto fallback = mounts.FindForPlan(0);
    const auto plans = store::RecordingPlans(records).List();
    std::set<int> ids;
    for (const store::Camera& camera : store::Cameras(records).List()) {
        const auto plan = plans.find(camera.id);
        const int planned = plan == plans.end() ? 0 : plan->second.mount_id;
        if (mount_id == 0 || mount_id == (planned != 0 ? planned : fallback ? fallback->id : 0)) {
            ids.insert(camera.id);
        }
    }
    return ids;
}

}  // namespace

CamGroup::CamGroup() : m_Id(0) {}

int CamGroup::Load(int groupId) {
    return OrFailure("CamGroup::Load", -1, [&] {
        if (!store::Groups(RequestContext::Current().Records()).Find(groupId)) {
            return -1;
        }
        m_Id = groupId;
        return 0;
    });
}

std::map<int, Camera> CamGroup::GetCamMap() const {
    const auto group = store::Groups(RequestContext::Current().Records()).Find(m_Id);
    return group ? RecordsOf(Without(group->camera_ids, DeniedCameras(store::CameraAccess::kPlayback)), true)
                 : std::map<int, Camera>{};
}

std::map<int, Camera> GetCamMountMap(int mountId, const std::string& deniedIds, bool withDeleted) {
    store::Store& records = RequestContext::Current().Records();
    std::set<int> ids = RecordingOn(records, mountId);
    ids.merge(store::Events(records).CamerasOn(mountId));
    ids = Without(std::move(ids), lookhaven::binding::IdSet(deniedIds));
    return RecordsOf(Without(std::move(ids), DeniedCameras(store::CameraAccess::kPlayback)), withDeleted);
}
