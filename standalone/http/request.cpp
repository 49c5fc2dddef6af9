// SPDX-License-Identifier: Apache-2.0
#include "standalone/http/request.h"

#include <cstring>

namespace lookhaven::http {

std::string_view Request::Header(std::string_view name) const {
    const auto found = headers.find(name);
    return found == headers.end() ? std::string_view() : found->second;
}

void Request::Wipe() {
    for (auto& [name, value] : headers) {
        http::Wipe(value);
    }
    http::Wipe(body);
}

void Wipe(std::string& text) {
    text.resize(text.capacity());
    ::explicit_bzero(text.data(), text.size());
    text.clear();
}

}  // namespace lookhaven::http
