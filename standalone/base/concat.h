// SPDX-License-Identifier: Apache-2.0
//
// Texts and numbers as one text.
#pragma once

#include <sstream>
#include <string>

namespace lookhaven::base {

// The parts in a row.
template <typename... Parts>
std::string Concat(const Parts&... parts) {
    std::ostringstream text;
    (text << ... << parts);
    return text.str();
}

}  // namespace lookhaven::base
