// SPDX-License-Identifier: Apache-2.0
//
// Decodes sequences of frames with libavcodec.
#pragma once

#include <memory>

#include "standalone/media/libav.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

// A decoder that refuses pictures above base::kMaxSidePixels. With one thread it works in the caller's own; threads
// that it starts take no signals. Of Motion JPEG it decodes pictures whose sides are halved as often as asked for,
// three times at most. Throws SourceError.
AvPtr<AVCodecContext> OpenVideoDecoder(Codec codec, int threads = 1, int halvings = 0);

// codec: kH264 or kH265. Throws SourceError.
std::unique_ptr<FrameDecoder> OpenFrameDecoder(Codec codec, int threads);

}  // namespace lookhaven::media
