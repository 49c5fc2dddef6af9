// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/source.h"

#include "standalone/base/blocked_signals.h"
#include "standalone/media/libav.h"

namespace lookhaven::media {

std::unique_ptr<Source> OpenSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options,
                                   std::stop_token stop) {
    const SourceOpener open = FindKind(kinds, url);
    if (open == nullptr) {
        throw SourceError("has an unknown kind of source; addresses begin with " + ListKinds(kinds));
    }
    PrepareAv();
    const base::BlockedSignals blocked;  // for the threads that libav may start
    return open(url, options, std::move(stop));
}

}  // namespace lookhaven::media
