// SPDX-License-Identifier: Apache-2.0
//
// Turns the store's cameras into the platform's records.
#pragma once

#include <set>
#include <string_view>

#include "platform/camera/camera.h"
#include "standalone/store/cameras.h"

namespace lookhaven::binding {

Camera PlatformCamera(const store::Camera& camera);

// The numbers in a list of ids that is joined by ",".
std::set<int> IdSet(std::string_view list);

}  // namespace lookhaven::binding
