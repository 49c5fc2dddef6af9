// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/video.h"

#include <algorithm>
#include <array>
#include <utility>

namespace lookhaven::base {

namespace {

constexpr std::array<std::pair<Codec, const char*>, 7> kNames{{
    {Codec::kMjpeg, "MJPEG"},
    {Codec::kH264, "H264"},
    {Codec::kH265, "H265"},
    {Codec::kAac, "AAC"},
    {Codec::kPcmMulaw, "PCMU"},
    {Codec::kPcmAlaw, "PCMA"},
    {Codec::kOpus, "OPUS"},
}};

}  // namespace

bool IsVideo(Codec codec) {
    return codec == Codec::kMjpeg || codec == Codec::kH264 || codec == Codec::kH265;
}

const char* CodecName(Codec codec) {
    const auto* found = std::ranges::find(kNames, codec, &std::pair<Codec, const char*>::first);
    return found == kNames.end() ? "" : found->second;
}

std::optional<Codec> CodecNamed(std::string_view name) {
    const auto* found = std::ranges::find(kNames, name, &std::pair<Codec, const char*>::second);
    return found == kNames.end() ? std::nullopt : std::optional(found->first);
}

}  // namespace lookhaven::base
