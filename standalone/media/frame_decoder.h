// SPDX-License-Identifier: Apache-2.0
//
// Decodes rows of frames with libavcodec.
#pragma once

#include <memory>

#include "standalone/media/libav.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

// A decoder that takes no picture larger than cameras send. One thread is the caller's own; of more, none takes signals.
// Throws SourceError.
AvPtr<AVCodecContext> OpenVideoDecoder(Codec codec, int threads = 1);

// Codec: H.264 or H.265. Throws SourceError.
std::unique_ptr<FrameDecoder> OpenFrameDecoder(Codec codec, int threads);

}  // namespace lookhaven::media
