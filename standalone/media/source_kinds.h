// SPDX-License-Identifier: Apache-2.0
//
// The kinds of source that OpenSource chooses from by the URL's scheme. Each throws SourceError as it does.
#pragma once

#include <memory>

#include "standalone/media/source.h"

namespace lookhaven::media {

std::unique_ptr<Source> OpenRtsp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenMjpegHttp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenFileLoop(const std::string& path, const SourceOptions& options, std::stop_token stop);

// The text behind "test:".
std::unique_ptr<Source> OpenPattern(const std::string& pattern, std::stop_token stop);

}  // namespace lookhaven::media
