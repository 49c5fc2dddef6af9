// SPDX-License-Identifier: Apache-2.0
//
// Finds out what a source sends.
#pragma once

#include <optional>
#include <string>

#include "standalone/media/source.h"

namespace lookhaven::media {

struct ProbeResult {
    StreamFormat video;
    double frames_per_second = 0;  // measured over the first second or so
    std::optional<StreamFormat> audio;
};

// Opens the source and reads up to a second and a half of it. Throws SourceError when it cannot be opened or no picture
// comes within the limit of the options.
ProbeResult ProbeSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options);

}  // namespace lookhaven::media
