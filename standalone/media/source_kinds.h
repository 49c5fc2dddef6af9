// SPDX-License-Identifier: Apache-2.0
//
// The kinds of source that CameraKinds names. Each is a SourceOpener.
#pragma once

#include <memory>

#include "standalone/media/source.h"

namespace lookhaven::media {

std::unique_ptr<Source> OpenRtsp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenMjpegHttp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenFileLoop(const std::string& url, const SourceOptions& options, std::stop_token stop);

}  // namespace lookhaven::media
