// SPDX-License-Identifier: Apache-2.0
#include "standalone/http/request.h"

namespace lookhaven::http {

std::string_view Request::Header(std::string_view name) const {
    const auto found = headers.find(name);
    return found == headers.end() ? std::string_view() : found->second;
}

}  // namespace lookhaven::http
