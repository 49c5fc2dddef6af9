// SPDX-License-Identifier: Apache-2.0
#include "standalone/demo/setup.h"

#include "standalone/demo/cameras.h"
#include "standalone/demo/emaps.h"
#include "standalone/store/users.h"

namespace lookhaven::demo {

bool HasViewer(store::Store& store) {
    return store::Users(store).FindByName(kViewer).has_value();
}

SetupResult SetUp(store::Store& store, const std::filesystem::path& home, const std::string& viewer_password) {
    store::Users users(store);
    const bool viewer_missing = !HasViewer(store);
    const CamerasAdded cameras = AddCameras(store);
    if (viewer_missing) {
        const store::User viewer = users.Add(kViewer, viewer_password, store::Privilege::kViewer);
        users.Deny(viewer.id, cameras.ids.at(kDeniedCamera));
    }
    return {.cameras_added = cameras.count,
            .viewer_added = viewer_missing,
            .emaps_added = AddEmaps(store, home, cameras.ids, users.FindByName(kViewer)->id)};
}

}  // namespace lookhaven::demo
