// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/still_library.h"

#include <exception>
#include <string_view>

#include "standalone/media/still.h"

namespace media = lookhaven::media;

extern "C" __attribute__((visibility("default"))) bool LookhavenStill(const char* codec, const std::uint8_t* data,
                                                                      std::size_t size_bytes,
                                                                      std::vector<std::uint8_t>& jpeg,
                                                                      std::string& problem) {
    try {
        const bool is_h265 = std::string_view(codec) == media::CodecName(media::Codec::kH265);
        jpeg = media::JpegOfKeyFrame(is_h265 ? media::Codec::kH265 : media::Codec::kH264, {data, size_bytes});
        return true;
    } catch (const std::exception& error) {
        problem = error.what();
        return false;
    }
}
