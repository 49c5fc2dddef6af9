// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/source.h"

#include "standalone/base/blocked_signals.h"
#include "standalone/media/libav.h"
#include "standalone/media/source_url.h"

namespace lookhaven::media {

std::unique_ptr<Source> OpenSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options,
                                   std::stop_token stop) {
    const auto kind = kinds.find(UrlScheme(url));
    if (kind == kinds.end()) {
        std::string known;
        for (const auto& [scheme, opener] : kinds) {
            known += (known.empty() ? "" : ", ") + scheme;
        }
        throw SourceError("is no source that is known (" + known + ")");
    }
    PrepareAv();
    const base::BlockedSignals blocked;  // for the threads that libav may start
    return kind->second(url, options, std::move(stop));
}

}  // namespace lookhaven::media
