// SPDX-License-Identifier: Apache-2.0
//
// Decodes a key frame of a camera into a picture, in a sandbox.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "standalone/api/call.h"
#include "standalone/media/libav_libraries.h"

namespace lookhaven::api {

// Confines this process for good (EnterStillPictureSandbox), then decodes. Afterwards only the answer can be written.
// Throws Failure with that status where the bytes cannot be decoded.
std::vector<std::uint8_t>
DecodeConfined(const Call& call, int failure_status,
               const std::function<std::vector<std::uint8_t>(const media::DecoderLibrary&)>& decode);

// A JPEG of the key frame, at most about that wide; one of Motion JPEG that is no wider is returned as it is, and the
// process stays as it was. frame_width: the key frame's. Throws Failure 404 where it cannot be decoded.
std::vector<std::uint8_t> SmallJpeg(const Call& call, const std::string& codec, std::vector<std::uint8_t> key_frame,
                                    int frame_width, int width);

}  // namespace lookhaven::api
