// SPDX-License-Identifier: Apache-2.0
//
// Decodes rows of frames with libavcodec.
#pragma once

#include <memory>

#include "standalone/media/libav.h"
#include "standalone/media/libav_library.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

// A decoder that works in its caller's thread and takes no picture larger than cameras send. Throws SourceError.
AvPtr<AVCodecContext> OpenVideoDecoder(Codec codec);

// Codec: H.264 or H.265. Throws SourceError.
std::unique_ptr<FrameDecoder> OpenFrameDecoder(Codec codec);

}  // namespace lookhaven::media
