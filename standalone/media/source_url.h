// SPDX-License-Identifier: Apache-2.0
//
// Source URLs: adds credentials for libav and removes them for logs.
#pragma once

#include <string>
#include <string_view>

#include "standalone/media/source.h"

namespace lookhaven::media {

// The URL with user and password in front of its host, percent-encoded; unchanged without credentials. Throws
// SourceError when they exceed libav's buffer, which would truncate them silently.
std::string WithCredentials(const std::string& url, const Credentials& credentials);

// The text with the user information and the query of every URL in it replaced by "…".
std::string RedactSecrets(std::string_view text);

}  // namespace lookhaven::media
