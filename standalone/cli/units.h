// SPDX-License-Identifier: Apache-2.0
//
// Times, durations and sizes as operators write and read them.
#pragma once

#include <charconv>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "standalone/base/amounts.h"

namespace lookhaven::cli {

using base::FormatDuration;
using base::FormatMoment;
using base::FormatSize;

// Nothing unless the whole text is one number.
template <typename Number>
std::optional<Number> ParseNumber(std::string_view text) {
    Number number{};
    const auto [rest, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && rest == text.data() + text.size() ? std::optional(number) : std::nullopt;
}

// "now"; "-2h" before now; seconds since the epoch; a date and time of base/moment.h. UTC seconds. These three throw
// Failure for another form.
std::int64_t ParseMoment(const std::string& text, std::int64_t now_s);
// "90s", "15m", "2h", "30d", "0": seconds.
std::int64_t ParseDuration(const std::string& text);
// "64K", "500M", "4G", "1.5T", "0": bytes, in powers of 1024.
std::int64_t ParseSize(const std::string& text);

}  // namespace lookhaven::cli
