// SPDX-License-Identifier: Apache-2.0
//
// Source URLs: their parts, credentials put in for libav and taken out for people.
#pragma once

#include <string>
#include <string_view>

#include "standalone/media/source.h"

namespace lookhaven::media {

// The lower-case letters before the first colon; empty when there is none.
std::string UrlScheme(std::string_view url);

// The URL with user and password in front of its host, percent-encoded; unchanged without credentials. Throws
// SourceError when they are longer than libav's buffer, which would cut them silently.
std::string WithCredentials(const std::string& url, const Credentials& credentials);

// The text with the user information and the query of every URL in it replaced by "…".
std::string RedactSecrets(std::string_view text);

}  // namespace lookhaven::media
