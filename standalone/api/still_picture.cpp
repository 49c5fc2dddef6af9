// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/still_picture.h"

#include <stdexcept>

#include "standalone/api/decoder_sandbox.h"
#include "standalone/base/log.h"
#include "standalone/base/video.h"

namespace lookhaven::api {

std::vector<std::uint8_t>
DecodeConfined(const Call& call, int failure_status,
               const std::function<std::vector<std::uint8_t>(const media::DecoderLibrary&)>& decode) {
    try {
        const media::DecoderLibrary& decoder = media::LoadDecoderLibrary();
        call.context.CloseRecords();
        EnterStillPictureSandbox(call.slots, call.slot);
        return decode(decoder);
    } catch (const std::runtime_error& problem) {
        base::LogError(std::string("no picture of a key frame: ") + problem.what());
        throw Failure(failure_status, "the camera's picture cannot be decoded");
    }
}

std::vector<std::uint8_t> SmallJpeg(const Call& call, const std::string& codec, std::vector<std::uint8_t> key_frame,
                                    int frame_width, int width) {
    if (codec == "MJPEG" && frame_width <= width) {
        return key_frame;
    }
    return DecodeConfined(call, 404, [&](const media::DecoderLibrary& library) {
        if (codec == "MJPEG") {
            return library.Shrink(key_frame, width);
        }
        const auto decoder = library.OpenDecoder(codec, 1);
        decoder->Feed(key_frame, 0);
        decoder->Feed({}, 0);
        if (!decoder->Take()) {
            throw std::runtime_error("no picture comes out of it");
        }
        std::vector<std::uint8_t> jpeg(base::kMaxFrameBytes);
        jpeg.resize(decoder->Encode(jpeg, width));
        return jpeg;
    });
}

}  // namespace lookhaven::api
