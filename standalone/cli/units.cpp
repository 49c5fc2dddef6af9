// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/units.h"

#include <cmath>

#include "standalone/base/moment.h"
#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

constexpr std::int64_t kMaxNumber = std::int64_t{1} << 50;

template <typename Number>
std::optional<Number> ParseQuantity(std::string_view text) {
    const auto number = ParseNumber<Number>(text);
    return number && *number >= 0 && *number <= static_cast<Number>(kMaxNumber) ? number : std::nullopt;
}

}  // namespace

std::int64_t ParseDuration(const std::string& text) {
    const std::size_t digits = text.find_first_not_of("0123456789");
    const std::string unit = digits != std::string::npos ? text.substr(digits) : text == "0" ? "s" : "";
    const std::int64_t factor = unit == "s" ? 1 : unit == "m" ? 60 : unit == "h" ? 3600 : unit == "d" ? 86400 : 0;
    const auto number = ParseQuantity<std::int64_t>(std::string_view(text).substr(0, digits));
    if (!number || factor == 0 || *number > kMaxNumber / factor) {
        throw Failure(kUsage, "a duration looks like 90s, 15m, 2h or 30d");
    }
    return *number * factor;
}

std::int64_t ParseSize(const std::string& text) {
    constexpr std::string_view kUnits = "KMGT";
    const std::size_t unit = text.empty() ? std::string::npos : kUnits.find(text.back());
    const bool has_unit = unit != std::string_view::npos;
    const auto number = ParseQuantity<double>(std::string_view(text).substr(0, text.size() - (has_unit ? 1 : 0)));
    const double bytes = number.value_or(-1) * std::pow(1024, has_unit ? static_cast<double>(unit + 1) : 0);
    if (!(bytes >= 0 && bytes <= static_cast<double>(kMaxNumber)) || (!has_unit && bytes != 0)) {
        throw Failure(kUsage, "a size looks like 500M, 4G or 1.5T");
    }
    return static_cast<std::int64_t>(bytes);
}

std::int64_t ParseMoment(const std::string& text, std::int64_t now_s) {
    if (text == "now") {
        return now_s;
    }
    if (text.starts_with('-')) {
        return now_s - ParseDuration(text.substr(1));
    }
    if (const auto seconds = ParseQuantity<std::int64_t>(text)) {
        return *seconds;
    }
    const std::optional<base::Moment> date = base::ParseMoment(text);
    if (!date || date->utc_s < 0) {
        throw Failure(kUsage, "a time looks like 2026-03-01 08:15, 2026-03-01T08:15:30Z, -2h or now");
    }
    return date->utc_s;
}

}  // namespace lookhaven::cli
