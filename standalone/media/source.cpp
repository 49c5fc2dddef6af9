// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/source.h"

#include "standalone/base/blocked_signals.h"
#include "standalone/media/libav.h"

namespace lookhaven::media {

SourceOpener FindKind(const SourceKinds& kinds, std::string_view url) {
    for (const auto& [beginning, opener] : kinds) {
        if (url.starts_with(beginning)) {
            const std::string_view rest = url.substr(beginning.size());
            const bool has_host = beginning.ends_with('/');
            return rest.empty() || (has_host && rest.find_first_of("/?#") == 0) ? nullptr : opener;
        }
    }
    return nullptr;
}

std::string ListKinds(const SourceKinds& kinds) {
    std::string list;
    for (std::size_t left = kinds.size(); const auto& [beginning, opener] : kinds) {
        list += beginning + (left > 2 ? ", " : left == 2 ? " or " : "");
        --left;
    }
    return list;
}

std::unique_ptr<Source> OpenSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options,
                                   std::stop_token stop) {
    const SourceOpener open = FindKind(kinds, url);
    if (open == nullptr) {
        throw SourceError("is no source that is known: it begins with " + ListKinds(kinds));
    }
    PrepareAv();
    const base::BlockedSignals blocked;  // for the threads that libav may start
    return open(url, options, std::move(stop));
}

}  // namespace lookhaven::media
