// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/packet.h"

namespace lookhaven::media {

const char* CodecName(Codec codec) {
    switch (codec) {
    case Codec::kMjpeg:
        return "MJPEG";
    case Codec::kH264:
        return "H264";
    case Codec::kH265:
        return "H265";
    case Codec::kAac:
        return "AAC";
    case Codec::kPcmMulaw:
        return "PCMU";
    case Codec::kPcmAlaw:
        return "PCMA";
    case Codec::kOpus:
        return "OPUS";
    }
    return "";
}

}  // namespace lookhaven::media
