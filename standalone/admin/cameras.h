// SPDX-License-Identifier: Apache-2.0
//
// Changes of cameras: what belongs to one is checked as a whole, and stored as a whole or not at all.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/admin/retention_limits.h"
#include "standalone/media/source.h"
#include "standalone/store/cameras.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

// All that is stored of a camera, its password included.
struct CameraSetup {
    store::Camera camera;  // id 0 before it is added
    std::optional<store::Credentials> credentials;
    std::optional<store::RecordingPlan> plan;  // nothing: around marks only, without footage from before
    std::set<int> groups;
};

// Changes a setup; whatever it throws ends the change.
using CameraEdit = std::function<void(CameraSetup&)>;

// Throws store::InvalidRecord for an address that begins with none of the kinds, names no valid host or port, or holds
// an account or password.
void RequireSource(const media::SourceKinds& kinds, const std::string& source);

// Throws store::NotFound.
CameraSetup ReadCamera(store::Store& store, int id);

// As pages of the web API show it, without password and with its revision. What the recorder finds out by itself (the
// codec) and the order of cameras are no part of the revision.
Json::Value ToJson(const CameraSetup& setup);

// Each of these checks the addresses that are new; where one throws, nothing was changed. They throw what Apply throws,
// InvalidRecord (for more than 1,000 cameras, too), NotFound, and Stale, whose record is that of ToJson, for another
// revision than the one seen and for a change made by somebody else while the edit ran.
//
// confirmed: also where a lower maximum age deletes recordings, for which it throws DeletesRecordings otherwise.
// prepare: may look at the stream, which takes seconds, and fill in what it finds. Called before anything is stored.
CameraSetup AddCamera(store::Store& store, const Actor& actor, const media::SourceKinds& kinds, CameraSetup setup,
                      const CameraEdit& prepare = {});
CameraSetup SetCamera(store::Store& store, const Actor& actor, const media::SourceKinds& kinds, int id,
                      std::optional<std::int64_t> seen, const CameraEdit& edit, bool confirmed = false);

enum class Footage { kKeep, kRemove };
// kRemove: once the camera is gone, its recordings are taken out of every search, in many small transactions, and the
// recorder deletes the files over time. Kept ones stay. Waits up to five seconds for the recorder to finish what it is
// writing. What is unfinished then, or left when this is interrupted or throws, the recorder's maintenance removes.
void RemoveCamera(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen, Footage footage);

// {"id": […], "revision"} of cameras in their order. The revision changes with it, and with a camera that comes or
// goes.
Json::Value OrderRecord(const std::vector<store::Camera>& cameras);
// ids: all cameras, each once. Returns the record of their order, which Stale has as it is.
Json::Value OrderCameras(store::Store& store, const Actor& actor, std::optional<std::int64_t> seen,
                         const std::vector<int>& ids);

}  // namespace lookhaven::admin
