// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/session_filter.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <new>
#include <utility>

#include <sys/mman.h>

#include "standalone/base/file.h"
#include "standalone/base/text.h"
#include "standalone/store/sessions.h"

namespace lookhaven::api {

struct SessionFilter::Page {
    // How many keys there have been. The newest is at that count modulo 2; the one before it stays in the other place,
    // where a reader may still be reading it.
    std::atomic<unsigned int> learnt;
    std::array<std::array<char, store::Sessions::kKeyDigits>, 2> keys;

    std::string_view Key() const {
        const unsigned int count = learnt;
        return count == 0 ? std::string_view() : std::string_view(keys[count % 2].data(), keys[count % 2].size());
    }
};

namespace {

bool HoldsSecret(std::string_view header, std::string_view key) {
    for (std::size_t at = 0; at < header.size(); ++at) {
        const std::size_t end = std::min(header.find_first_not_of(base::kHexDigits, at), header.size());
        const std::string_view text = header.substr(at, end - at);
        if (key.empty() ? store::Sessions::MayBeSecret(text) : store::Sessions::MayBeSecret(text, key)) {
            return true;
        }
        at = end;
    }
    return false;
}

}  // namespace

SessionFilter::SessionFilter() {
    void* memory = ::mmap(nullptr, sizeof(Page), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED) {
        base::ThrowErrno("cannot map memory for the session key");
    }
    page_ = new (memory) Page{};
}

SessionFilter::~SessionFilter() {
    Close();
}

void SessionFilter::Learn(const std::string& key) {
    if (page_->Key() != key && key.size() == store::Sessions::kKeyDigits) {
        std::ranges::copy(key, page_->keys[(page_->learnt + 1) % 2].begin());
        ++page_->learnt;
    }
}

bool SessionFilter::MayHaveSession(const http::Request& request) const {
    const std::string_view key = page_->Key();
    return HoldsSecret(request.Header("HTTP_COOKIE"), key) || HoldsSecret(request.Header("HTTP_AUTHORIZATION"), key);
}

void SessionFilter::Close() {
    if (Page* page = std::exchange(page_, nullptr); page != nullptr) {
        ::munmap(page, sizeof(Page));
    }
}

}  // namespace lookhaven::api
