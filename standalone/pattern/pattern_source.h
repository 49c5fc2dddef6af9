// SPDX-License-Identifier: Apache-2.0
//
// The test pattern as a live source: a generated scene with a running clock and frame number.
//
//   test:mjpeg?size=1280x720&fps=25&quality=80&label=Entrance
//   test:h264?size=1280x720&fps=25&gop=25&audio=aac&label=Parking
#pragma once

#include <memory>

#include "standalone/media/source.h"

namespace lookhaven::pattern {

// A media::SourceOpener. Ignores the options: it needs no credentials and never stalls.
std::unique_ptr<media::Source> OpenPattern(const std::string& url, const media::SourceOptions& options,
                                           std::stop_token stop);

// camera::IsolatedKinds and the test pattern ("test:").
media::SourceKinds AllSourceKinds();

}  // namespace lookhaven::pattern
