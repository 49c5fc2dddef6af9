// SPDX-License-Identifier: Apache-2.0
//
// Changes of doors, I/O modules and POS terminals, and of the ports of cameras.
//
// Failures      Each throws Forbidden, Stale, store::NotFound (for an unknown camera or server, too),
//               store::InvalidRecord, store::AlreadyExists and store::StoreError; nothing was changed then.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/store/devices.h"

namespace lookhaven::admin {

// {"kind", "id", "name", "server", "idOnServer", "camera", "port": [{"port", "type", "camera"}], "revision"}, with
// store::DeviceKindNames and store::PortTypeNames. An id is one of its kind.
Json::Value DeviceRecord(const store::Device& device);

// AddDevice and SetDevice return the device as stored.
store::Device AddDevice(store::Store& store, const Actor& actor, const store::Device& device);
// seen: the record's revision that the actor saw; nothing for whatever it is. edit changes name, camera and ports; what
// it throws ends the change.
store::Device SetDevice(store::Store& store, const Actor& actor, store::EmapItemType kind, int id,
                        std::optional<std::int64_t> seen, const std::function<void(store::Device&)>& edit);
// Its items stay on their maps, hidden, except a door's, which is shown without a state.
void RemoveDevice(store::Store& store, const Actor& actor, store::EmapItemType kind, int id,
                  std::optional<std::int64_t> seen);

// How many inputs and outputs a camera of this host or of a paired one has, which stand on e-maps.
void SetCameraPorts(store::Store& store, const Actor& actor, int camera, store::PortCounts counts);

}  // namespace lookhaven::admin
