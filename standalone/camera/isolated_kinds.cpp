// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/isolated_source.h"

namespace lookhaven::camera {

media::SourceKinds IsolatedKinds() {
    media::SourceKinds kinds = NetworkKinds();
    kinds.merge(media::CameraKinds());
    return kinds;
}

}  // namespace lookhaven::camera
