// SPDX-License-Identifier: Apache-2.0
//
// The demo's cameras: test patterns, two of them recorded and grouped.
#pragma once

#include <map>
#include <set>
#include <string>
#include <vector>

#include "standalone/store/cameras.h"
#include "standalone/store/store.h"

namespace lookhaven::demo {

// The camera that the demo's viewer is denied.
constexpr const char* kDeniedCamera = "Parking";

struct CamerasAdded {
    std::map<std::string, int> ids;  // of every demo camera by name, whether added now or before
    int count = 0;                   // added now
};

// Adds the cameras that are missing by name, records those of them that the demo records, and adds the group. Cameras
// that exist keep their record and plan. In a store without cameras and events the default mount's limit is lowered.
CamerasAdded AddCameras(store::Store& store);

// The cameras that still have the demo's name and source.
std::vector<store::Camera> FindCameras(store::Store& store);

// Removes the demo's group unless it has got other cameras.
void RemoveGroup(store::Store& store, const std::set<int>& cameras);

}  // namespace lookhaven::demo
