// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/settings_file.h"

#include <algorithm>
#include <charconv>
#include <fstream>
#include <functional>
#include <map>
#include <numeric>
#include <string_view>
#include <utility>
#include <vector>

#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

constexpr int kMinPort = 1024;  // the services are not root's
constexpr int kMaxPort = 65535;
using Values = std::map<std::string, std::string, std::less<>>;
const Values kDefaults{{"LOOKHAVEN_PORT", "8080"}, {"LOOKHAVEN_TLS_PORT", "8443"}};

// How many characters must be inserted, removed or replaced to make one of the other.
std::size_t EditDistance(std::string_view one, std::string_view other) {
    std::vector<std::size_t> row(other.size() + 1);
    std::iota(row.begin(), row.end(), std::size_t{0});
    for (std::size_t i = 0; i < one.size(); ++i) {
        std::size_t diagonal = std::exchange(row[0], i + 1);
        for (std::size_t j = 0; j < other.size(); ++j) {
            const std::size_t replaced = diagonal + (one[i] == other[j] ? 0 : 1);
            diagonal = row[j + 1];
            row[j + 1] = std::min({diagonal + 1, row[j] + 1, replaced});
        }
    }
    return row.back();
}

const std::string& NearestKey(std::string_view key) {
    return std::ranges::min_element(kDefaults, {}, [key](const auto& entry) { return EditDistance(key, entry.first); })
        ->first;
}

std::string_view Trimmed(std::string_view text, std::string_view characters) {
    text.remove_prefix(std::min(text.find_first_not_of(characters), text.size()));
    return text.substr(0, text.find_last_not_of(characters) + 1);
}

bool IsPort(std::string_view text) {
    int port = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), port);
    return error == std::errc() && end == text.data() + text.size() && port >= kMinPort && port <= kMaxPort;
}

}  // namespace

void CheckSettingsFile(const std::string& path) {
    std::ifstream file(path);
    Values ports = kDefaults;
    int number = 0;
    for (std::string text; std::getline(file, text);) {
        ++number;
        const std::string_view line = Trimmed(text, " \t\r");
        if (line.empty() || line.front() == '#' || line.front() == ';') {
            continue;
        }
        const std::string_view key = Trimmed(line.substr(0, line.find('=')), " \t");
        const auto known = ports.find(key);
        if (known == ports.end()) {
            throw Failure(kConfigError, path, " line ", number, ": there is no setting ", key, "; did you mean ",
                          NearestKey(key), "?");
        }
        known->second = Trimmed(line.substr(std::min(line.find('='), line.size() - 1) + 1), " \t\"'");
        if (!IsPort(known->second)) {
            throw Failure(kConfigError, path, " line ", number, ": ", key, " must be a number from ", kMinPort, " to ",
                          kMaxPort);
        }
    }
    if (ports.begin()->second == ports.rbegin()->second) {
        throw Failure(kConfigError, path, ": LOOKHAVEN_PORT and LOOKHAVEN_TLS_PORT are both ", ports.begin()->second);
    }
}

}  // namespace lookhaven::cli
