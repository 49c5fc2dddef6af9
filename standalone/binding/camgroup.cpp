// SPDX-License-Identifier: Apache-2.0
//
// Sets of cameras to play back from, without those that are denied to the caller.
#include "platform/camera/camgroup.h"

#include <algorithm>
#include <vector>

#include "standalone/binding/camera_record.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/store/events.h"
#include "standalone/store/groups.h"

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

std::map<int, Camera> RecordsOf(const std::vector<store::Camera>& records, const std::set<int>& ids,
                                bool with_removed) {
    std::map<int, Camera> cameras;
    for (const store::Camera& record : records) {
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

// The cameras that are recorded to the mount; mount 0: to any.
std::set<int> RecordingOn(const std::vector<store::Camera>& cameras, int mount_id) {
    RequestContext& context = RequestContext::Current();
    std::set<int> ids;
    for (const store::Camera& camera : cameras) {
        const store::Mount* mount = context.MountOf(camera.id);
        if (mount_id == 0 || (mount != nullptr && mount->id == mount_id)) {
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
    store::Store& records = RequestContext::Current().Records();
    const auto group = store::Groups(records).Find(m_Id);
    return group ? RecordsOf(store::Cameras(records).List(),
                             Without(group->camera_ids, DeniedCameras(store::CameraAccess::kPlayback)), true)
                 : std::map<int, Camera>{};
}

std::map<int, Camera> GetCamMountMap(int mountId, const std::string& deniedIds, bool withDeleted) {
    store::Store& records = RequestContext::Current().Records();
    const std::vector<store::Camera> cameras = store::Cameras(records).List();
    std::set<int> ids = RecordingOn(cameras, mountId);
    ids.merge(store::Events(records).CamerasOn(mountId));
    ids = Without(std::move(ids), lookhaven::binding::IdSet(deniedIds));
    return RecordsOf(cameras, Without(std::move(ids), DeniedCameras(store::CameraAccess::kPlayback)), withDeleted);
}
