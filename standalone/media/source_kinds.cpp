// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/source_kinds.h"

namespace lookhaven::media {

SourceKinds CameraKinds() {
    return {{"rtsp://", OpenRtsp}, {"http://", OpenMjpegHttp}, {"https://", OpenMjpegHttp}, {"file:", OpenFileLoop}};
}

}  // namespace lookhaven::media
