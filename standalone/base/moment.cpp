// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/moment.h"

#include <algorithm>
#include <ctime>

namespace lookhaven::base {

namespace {

constexpr const char* kDigits = "0123456789";
constexpr int kMaxZoneHours = 14;

// Cuts the zone off and gives its distance to UTC; nothing where there is none.
std::optional<std::int64_t> TakeZone(std::string& text) {
    if (text.ends_with('Z')) {
        text.pop_back();
        return 0;
    }
    const std::size_t sign = text.find_last_of("+-");
    if (sign == std::string::npos || sign < text.find(':')) {  // a date has dashes, too
        return std::nullopt;
    }
    std::string offset = text.substr(sign + 1);
    if (offset.size() == 5 && offset[2] == ':') {
        offset.erase(2, 1);
    }
    if (offset.size() != 4 || offset.find_first_not_of(kDigits) != std::string::npos) {
        return std::nullopt;
    }
    const int hours = std::stoi(offset.substr(0, 2));
    const int minutes = std::stoi(offset.substr(2));
    if (hours > kMaxZoneHours || minutes > 59) {
        return std::nullopt;
    }
    const std::int64_t distance_s = std::int64_t{hours} * 3600 + minutes * 60;
    const bool is_east = text[sign] == '+';
    text.resize(sign);
    return is_east ? distance_s : -distance_s;
}

// Cuts off what follows the seconds.
void DropFraction(std::string& text) {
    const std::size_t point = text.find_last_of(".,");
    if (point != std::string::npos && point + 1 < text.size() && std::count(text.begin(), text.end(), ':') == 2 &&
        text.find_first_not_of(kDigits, point + 1) == std::string::npos) {
        text.resize(point);
    }
}

}  // namespace

std::optional<Moment> ParseMoment(std::string text) {
    // strptime skips blanks, and stops at the first NUL.
    if (text.empty() || text.front() < '0' || text.front() > '9' || text.find('\0') != std::string::npos) {
        return std::nullopt;
    }
    const std::optional<std::int64_t> east_s = TakeZone(text);
    DropFraction(text);
    for (const char* form :
         {"%Y-%m-%dT%H:%M:%S", "%Y-%m-%d %H:%M:%S", "%Y-%m-%dT%H:%M", "%Y-%m-%d %H:%M", "%Y-%m-%d"}) {
        std::tm time{};
        const char* rest = ::strptime(text.c_str(), form, &time);
        if (rest == nullptr || *rest != '\0' || time.tm_sec > 59) {
            continue;
        }
        time.tm_isdst = -1;
        const int day = time.tm_mday;
        const std::int64_t moment_s = east_s ? ::timegm(&time) - *east_s : ::mktime(&time);
        return time.tm_mday == day ? std::optional(Moment{moment_s, east_s.has_value()}) : std::nullopt;
    }
    return std::nullopt;
}

}  // namespace lookhaven::base
