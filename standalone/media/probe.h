// SPDX-License-Identifier: Apache-2.0
//
// Finds out what a source sends.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "standalone/media/source.h"

namespace lookhaven::media {

struct ProbeResult {
    StreamFormat video;
    double frames_per_second = 0;  // measured over the first second or so
    std::optional<StreamFormat> audio;
    std::vector<std::uint8_t> key_frame;  // the first one; empty when none came meanwhile
};

// Reads up to a second and a half of the source, or five where no key frame comes before. Throws SourceError when no
// picture comes within the source's limit.
ProbeResult Probe(Source& source);

// Opens the source first. Throws SourceError.
inline ProbeResult ProbeSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options) {
    return Probe(*OpenSource(kinds, url, options, {}));
}

}  // namespace lookhaven::media
