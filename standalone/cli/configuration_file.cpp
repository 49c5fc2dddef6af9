// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/configuration_file.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <fstream>
#include <functional>
#include <map>
#include <numeric>
#include <string_view>
#include <utility>
#include <vector>

#include <arpa/inet.h>
#include <netinet/in.h>

#include "standalone/cli/console.h"

namespace lookhaven::cli {

namespace {

constexpr int kMinPort = 1024;  // the services are not root's
constexpr int kMaxPort = 65535;
constexpr const char* kPort = "LOOKHAVEN_PORT";
constexpr const char* kTlsPort = "LOOKHAVEN_TLS_PORT";
constexpr const char* kTrustedProxies = "LOOKHAVEN_TRUSTED_PROXIES";
using Values = std::map<std::string, std::string, std::less<>>;
const Values kDefaults{{kPort, "8080"}, {kTlsPort, "8443"}, {kTrustedProxies, ""}};

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

bool IsNumber(std::string_view text, int min, int max) {
    int number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size() && number >= min && number <= max;
}

// An address, or a network such as 192.0.2.0/24.
bool IsNetwork(std::string_view text) {
    const std::size_t slash = std::min(text.find('/'), text.size());
    const std::string address(text.substr(0, slash));
    std::array<unsigned char, sizeof(in6_addr)> bytes{};
    const int prefix_bits = ::inet_pton(AF_INET, address.c_str(), bytes.data()) == 1    ? 32
                            : ::inet_pton(AF_INET6, address.c_str(), bytes.data()) == 1 ? 128
                                                                                        : -1;
    return prefix_bits > 0 && (slash == text.size() || IsNumber(text.substr(slash + 1), 1, prefix_bits));
}

// The first of the words that is no network; empty when all are.
std::string_view NotANetwork(std::string_view words) {
    constexpr std::string_view kBetween = ", ";
    while (!(words = Trimmed(words, kBetween)).empty()) {
        const std::string_view word = words.substr(0, words.find_first_of(kBetween));
        if (!IsNetwork(word)) {
            return word;
        }
        words.remove_prefix(word.size());
    }
    return {};
}

}  // namespace

void CheckConfigurationFile(const std::string& path) {
    std::ifstream file(path);
    Values values = kDefaults;
    int number = 0;
    for (std::string text; std::getline(file, text);) {
        ++number;
        const std::string_view line = Trimmed(text, " \t\r");
        if (line.empty() || line.front() == '#' || line.front() == ';') {
            continue;
        }
        const std::string_view key = Trimmed(line.substr(0, line.find('=')), " \t");
        const auto known = values.find(key);
        if (known == values.end()) {
            throw Failure(kConfigError, path, " line ", number, ": there is no setting ", key, "; did you mean ",
                          NearestKey(key), "?");
        }
        known->second = Trimmed(line.substr(std::min(line.find('='), line.size() - 1) + 1), " \t\"'");
        if (key == kTrustedProxies) {
            if (const std::string_view wrong = NotANetwork(known->second); !wrong.empty()) {
                throw Failure(kConfigError, path, " line ", number, ": ", wrong,
                              " is neither an address nor a network such as 192.0.2.0/24");
            }
        } else if (!IsNumber(known->second, kMinPort, kMaxPort)) {
            throw Failure(kConfigError, path, " line ", number, ": ", key, " must be a number from ", kMinPort, " to ",
                          kMaxPort);
        }
    }
    if (values[kPort] == values[kTlsPort]) {
        throw Failure(kConfigError, path, ": ", kPort, " and ", kTlsPort, " are both ", values[kPort]);
    }
}

}  // namespace lookhaven::cli
