// SPDX-License-Identifier: Apache-2.0
//
// Which kind of source a URL names; needs no libav.
#include <algorithm>

#include "standalone/media/source_kinds.h"

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

const NetworkKind* FindNetworkKind(std::string_view address) {
    const auto* found = std::ranges::find_if(
        kNetworkKinds, [address](const NetworkKind& kind) { return address.starts_with(kind.beginning); });
    return found == kNetworkKinds.end() ? nullptr : found;
}

std::string ListKinds(const SourceKinds& kinds) {
    std::string list;
    for (std::size_t left = kinds.size(); const auto& [beginning, opener] : kinds) {
        list += beginning + (left > 2 ? ", " : left == 2 ? " or " : "");
        --left;
    }
    return list;
}

}  // namespace lookhaven::media
