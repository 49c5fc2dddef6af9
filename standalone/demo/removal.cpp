// SPDX-License-Identifier: Apache-2.0
#include "standalone/demo/removal.h"

#include <algorithm>
#include <set>
#include <vector>

#include "standalone/demo/cameras.h"
#include "standalone/demo/emaps.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"

namespace lookhaven::demo {

namespace {

std::set<int> DisableCameras(store::Store& store) {
    std::set<int> ids;
    for (store::Camera& camera : FindCameras(store)) {
        ids.insert(camera.id);
        if (camera.enabled) {
            camera.enabled = false;
            store::Cameras(store).Update(camera);
        }
    }
    return ids;
}

}  // namespace

RemovalResult Remove(store::Store& store, const std::filesystem::path& home) {
    const std::set<int> cameras = DisableCameras(store);
    store::Events events(store);
    std::vector<int> ids;
    RemovalResult result;
    events.Visit({.camera_ids = cameras}, [&](const store::Event& event) {
        result.growing += event.recording ? 1 : 0;
        if (!event.kept && !event.demo) {
            ids.push_back(event.id);
        }
    });
    if (result.growing > 0) {
        return result;
    }
    events.RemoveDemo();
    events.BeginDeletion(ids);
    result.recordings = static_cast<int>(ids.size());
    result.emaps = RemoveEmaps(store, home, cameras);
    RemoveGroup(store, cameras);
    for (const int camera : cameras) {
        store::Cameras(store).Remove(camera);
        ++result.cameras;
    }
    return result;
}

}  // namespace lookhaven::demo
