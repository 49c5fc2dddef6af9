// SPDX-License-Identifier: Apache-2.0
//
// How people and programs write a codec, where that is not CodecName of video.h.
#pragma once

#include <string>

#include "standalone/base/names.h"
#include "standalone/base/video.h"

namespace lookhaven::base {

// "mjpeg", "h264", "h265": the web API and the command line. Empty for a number that is no codec's.
std::string CodecWord(Codec codec);

// The video codecs by those words.
const Names<Codec>& VideoCodecWords();

// "MJPEG", "H.264", "H.265": for people. Empty as above.
std::string CodecTitle(Codec codec);

}  // namespace lookhaven::base
