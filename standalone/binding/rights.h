// SPDX-License-Identifier: Apache-2.0
//
// What the caller of this request process may do with a camera, or see of an e-map, a door or an I/O module.
//
// Why so        Not every handler of the module filters all that it shows. So the platform checks here before it opens
//               anything of a camera.
#pragma once

#include <set>

#include <json/json.h>

#include "platform/export.h"
#include "standalone/binding/request_context.h"
#include "standalone/store/users.h"

namespace lookhaven::binding {

// The rights that a paired host sends with the request. All of them are understood, or Json::Exception is thrown; their
// shape is in privilege.cpp.
LH_PLATFORM_API Restrictions RestrictionsOf(const Json::Value& priv_data);

// False for a camera that is denied to the caller or that the request's "privData" denies, and for nobody as the
// caller. Throws store::StoreError.
LH_PLATFORM_API bool MayUse(int camera, store::CameraAccess kind);

// False for an item that is denied to the caller, and for nobody as the caller. Throws store::StoreError.
LH_PLATFORM_API bool MaySee(store::DeniableItem kind, int id);

// Whether the caller is a manager of the host, and the request leaves them that. Throws store::StoreError.
LH_PLATFORM_API bool IsManager();

// The cameras at which MayUse is false for a caller who is somebody. Throws store::StoreError.
LH_PLATFORM_API std::set<int> DeniedCameras(store::CameraAccess kind);

}  // namespace lookhaven::binding
