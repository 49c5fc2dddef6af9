// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/source_kinds.h"

namespace lookhaven::media {

namespace {

SourceOpener OpenerOf(Protocol protocol) {
    switch (protocol) {
    case Protocol::kRtsp:
        return OpenRtsp;
    case Protocol::kMjpegOverHttp:
        return OpenMjpegHttp;
    }
    return nullptr;
}

}  // namespace

SourceKinds CameraKinds() {
    SourceKinds kinds = {{"file:", OpenFileLoop}};
    for (const NetworkKind& kind : kNetworkKinds) {
        kinds.emplace(kind.beginning, OpenerOf(kind.protocol));
    }
    return kinds;
}

}  // namespace lookhaven::media
