// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/isolated_source.h"

namespace lookhaven::camera {

media::SourceKinds IsolatedKinds() {
    media::SourceKinds kinds = media::CameraKinds();
    for (auto& [beginning, opener] : kinds) {
        if (beginning.ends_with("://")) {
            opener = OpenIsolated;
        }
    }
    return kinds;
}

}  // namespace lookhaven::camera
