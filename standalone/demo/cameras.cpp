// SPDX-License-Identifier: Apache-2.0
#include "standalone/demo/cameras.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <vector>

#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::demo {

namespace {

using store::Camera;

constexpr const char* kGroup = "Yard";
constexpr std::int64_t kMaxMountBytes = std::int64_t{4} << 30;

struct DemoCamera {
    Camera camera;
    bool recorded;
};

std::vector<DemoCamera> DemoCameras() {
    return {
        {{.name = "Entrance",
          .profiles = {{0, "test:mjpeg?size=1280x720&fps=25&label=Entrance", 1280, 720, 25},
                       {1, "test:mjpeg?size=640x360&fps=25&label=Entrance", 640, 360, 25}}},
         true},
        {{.name = kDeniedCamera,
          .video_type = base::Codec::kH264,
          .audio = true,
          .profiles = {{0, "test:h264?size=1280x720&fps=25&audio=aac&label=Parking", 1280, 720, 25}}},
         true},
        {{.name = "Warehouse",
          .enabled = false,
          .profiles = {{0, "test:mjpeg?size=1280x720&fps=25&label=Warehouse", 1280, 720, 25}}},
         false},
        {{.name = "Gate",
          .ptz = true,
          .audio = true,
          .profiles = {{0, "test:mjpeg?size=1280x720&fps=25&label=Gate", 1280, 720, 25}}},
         false},
    };
}

void AddGroup(store::Store& store, const store::CameraGroup& group) {
    store::Groups groups(store);
    const std::vector<store::CameraGroup> known = groups.List();
    if (std::ranges::find(known, group.name, &store::CameraGroup::name) == known.end()) {
        groups.Add(group);
    }
}

// Only where nothing has been recorded yet: a lower limit removes recordings.
void LimitDefaultMount(store::Store& store) {
    store::Mounts mounts(store);
    std::optional<store::Mount> mount = mounts.FindForPlan(0);
    if (mount && store::Events(store).Content(mount->id).events == 0 &&
        (mount->max_bytes == 0 || mount->max_bytes > kMaxMountBytes)) {
        mount->max_bytes = kMaxMountBytes;
        mounts.Update(*mount);
    }
}

}  // namespace

CamerasAdded AddCameras(store::Store& store) {
    store::Cameras cameras(store);
    const std::vector<Camera> known = cameras.List();
    CamerasAdded added;
    store::CameraGroup group{0, kGroup, {}};
    for (const auto& [camera, recorded] : DemoCameras()) {
        const auto found = std::ranges::find(known, camera.name, &Camera::name);
        const bool missing = found == known.end();
        const int id = missing ? cameras.Add(camera) : found->id;
        added.ids[camera.name] = id;
        added.count += missing ? 1 : 0;
        if (recorded) {
            group.camera_ids.insert(id);
        }
        if (recorded && missing) {
            store::RecordingPlans(store).Set(id, {.mode = store::RecordMode::kAlways});
        }
    }
    AddGroup(store, group);
    if (known.empty()) {
        LimitDefaultMount(store);
    }
    return added;
}

std::vector<Camera> FindCameras(store::Store& store) {
    std::vector<Camera> found = store::Cameras(store).List();
    std::erase_if(found, [demo = DemoCameras()](const Camera& camera) {
        return std::ranges::none_of(demo, [&](const DemoCamera& each) {
            return each.camera.name == camera.name && each.camera.profiles == camera.profiles;
        });
    });
    return found;
}

void RemoveGroup(store::Store& store, const std::set<int>& cameras) {
    store::Groups groups(store);
    for (const store::CameraGroup& group : groups.List()) {
        if (group.name == kGroup && std::ranges::includes(cameras, group.camera_ids)) {
            groups.Remove(group.id);
        }
    }
}

}  // namespace lookhaven::demo
