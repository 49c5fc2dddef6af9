// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/source.h"

#include <algorithm>

#include "standalone/base/blocked_signals.h"
#include "standalone/media/libav.h"
#include "standalone/media/source_kinds.h"
#include "standalone/media/source_url.h"

namespace lookhaven::media {

namespace {

std::unique_ptr<Source> Open(const std::string& url, const SourceOptions& options, std::stop_token stop) {
    const std::string scheme = UrlScheme(url);
    const std::string rest = url.substr(std::min(scheme.size() + 1, url.size()));
    if (scheme == "rtsp") {
        return OpenRtsp(url, options, std::move(stop));
    }
    if (scheme == "http" || scheme == "https") {
        return OpenMjpegHttp(url, options, std::move(stop));
    }
    if (scheme == "file") {
        return OpenFileLoop(rest.starts_with("///") ? rest.substr(2) : rest, options, std::move(stop));
    }
    if (scheme == "test") {
        return OpenPattern(rest, std::move(stop));
    }
    throw SourceError("is no source that is known (rtsp, http, https, file, test)");
}

}  // namespace

std::unique_ptr<Source> OpenSource(const std::string& url, const SourceOptions& options, std::stop_token stop) {
    PrepareAv();
    const base::BlockedSignals blocked;  // for the threads that libav may start
    return Open(url, options, std::move(stop));
}

}  // namespace lookhaven::media
