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
    std::atomic<bool> is_known;  // set after the key, which stays as it is then
    std::array<char, store::Sessions::kKeyDigits> key;
};

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
    if (!page_->is_known && key.size() == page_->key.size()) {
        std::ranges::copy(key, page_->key.begin());
        page_->is_known = true;
    }
}

bool SessionFilter::MayHaveSession(const http::Request& request) const {
    const bool is_known = page_->is_known;
    const std::string_view key(page_->key.data(), page_->key.size());
    const std::string_view cookies = request.Header("HTTP_COOKIE");
    for (std::size_t at = 0; at < cookies.size(); ++at) {
        const std::size_t end = std::min(cookies.find_first_not_of(base::kHexDigits, at), cookies.size());
        const std::string_view text = cookies.substr(at, end - at);
        if (is_known ? store::Sessions::MayBeSecret(text, key) : store::Sessions::MayBeSecret(text)) {
            return true;
        }
        at = end;
    }
    return false;
}

void SessionFilter::Close() {
    if (Page* page = std::exchange(page_, nullptr); page != nullptr) {
        ::munmap(page, sizeof(Page));
    }
}

}  // namespace lookhaven::api
