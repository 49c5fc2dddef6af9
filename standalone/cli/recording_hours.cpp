// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/recording_hours.h"

#include <algorithm>
#include <array>
#include <optional>
#include <sstream>
#include <utility>
#include <vector>

#include "standalone/cli/console.h"
#include "standalone/cli/units.h"

namespace lookhaven::cli {

namespace {

constexpr int kDays = 7;
constexpr int kHoursOfDay = 24;
constexpr std::array<const char*, kDays> kDayNames = {"mon", "tue", "wed", "thu", "fri", "sat", "sun"};
constexpr std::array<std::pair<const char*, char>, 3> kModes{{{"never", '0'}, {"always", '1'}, {"alarm", '2'}}};

struct Span {
    int first = 0;
    int count = 0;
};

// "a-b", or "a" alone.
std::pair<std::string, std::string> Ends(const std::string& word) {
    const std::size_t dash = word.find('-');
    return {word.substr(0, dash), dash == word.npos ? word : word.substr(dash + 1)};
}

std::optional<int> DayNamed(const std::string& name) {
    const auto* const found = std::ranges::find(kDayNames, name);
    return found == kDayNames.end() ? std::nullopt : std::optional(static_cast<int>(found - kDayNames.begin()));
}

std::optional<Span> ParseDays(const std::string& word) {
    const auto [first, last] = Ends(word);
    const std::optional<int> from = DayNamed(first);
    const std::optional<int> to = DayNamed(last);
    return from && to ? std::optional(Span{*from, (*to - *from + kDays) % kDays + 1}) : std::nullopt;
}

std::optional<Span> ParseTimes(const std::string& word) {
    const auto [first, last] = Ends(word);
    const std::optional<int> from = ParseNumber<int>(first);
    const std::optional<int> to = ParseNumber<int>(last);
    if (!from || !to || *from < 0 || *from >= kHoursOfDay || *to < 0 || *to > kHoursOfDay || *from == *to) {
        return std::nullopt;
    }
    return Span{*from, (*to - *from + kHoursOfDay) % kHoursOfDay == 0 ? kHoursOfDay
                                                                      : (*to - *from + kHoursOfDay) % kHoursOfDay};
}

}  // namespace

void SetHours(std::string& hours, const std::string& span) {
    std::istringstream text(span);
    std::vector<std::string> words;
    for (std::string word; text >> word;) {
        words.push_back(word);
    }
    const auto* const mode =
        words.empty() ? kModes.end()
                      : std::ranges::find_if(kModes, [&words](const auto& each) { return words.back() == each.first; });
    Span days{0, kDays};
    Span times{0, kHoursOfDay};
    bool is_right = mode != kModes.end();
    for (std::size_t i = 0; i + 1 < words.size(); ++i) {
        if (const std::optional<Span> named = ParseDays(words[i])) {
            days = *named;
        } else if (const std::optional<Span> told = ParseTimes(words[i])) {
            times = *told;
        } else {
            is_right = false;
        }
    }
    if (!is_right) {
        throw Failure(kUsage, "hours look like \"mon-fri 8-18 always\", \"sat 0-24 alarm\" or \"never\"");
    }
    for (int day = days.first; day < days.first + days.count; ++day) {
        for (int hour = times.first; hour < times.first + times.count; ++hour) {
            hours.at(static_cast<std::size_t>((day * kHoursOfDay + hour) % (kDays * kHoursOfDay))) = mode->second;
        }
    }
}

std::string HoursText(const std::string& hours) {
    std::string text = "     0     6     12    18\n";
    for (int day = 0; day < kDays; ++day) {
        std::string line = hours.substr(static_cast<std::size_t>(day * kHoursOfDay), kHoursOfDay);
        std::ranges::transform(line, line.begin(), [](char mode) {
            return mode == '0' ? '.' : mode == '1' ? '#' : 'a';
        });
        text += Concat(kDayNames.at(static_cast<std::size_t>(day)), "  ", line, "\n");
    }
    return text + "# always, a on alert, . never";
}

}  // namespace lookhaven::cli
