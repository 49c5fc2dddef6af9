// SPDX-License-Identifier: Apache-2.0
//
// Sets up a demo: cameras, a viewer with fewer rights, e-maps.
#pragma once

#include <filesystem>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::demo {

constexpr const char* kViewer = "viewer";

struct SetupResult {
    int cameras_added = 0;
    bool viewer_added = false;
    int emaps_added = 0;
};

bool HasViewer(store::Store& store);

// Adds what is missing and leaves the rest as it is. home: the state folder. viewer_password is not used when
// HasViewer().
SetupResult SetUp(store::Store& store, const std::filesystem::path& home, const std::string& viewer_password);

}  // namespace lookhaven::demo
