// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/pair_token.h"

#include <charconv>
#include <cstdlib>

#include "standalone/remote/token_code.h"

namespace lookhaven::remote {

namespace {

constexpr std::string_view kLabel = "lookhaven pair 1\n";
constexpr std::size_t kMaxTimestampDigits = 12;

// False for a text that is not plain decimal: two texts of one number would make two tokens.
bool IsWithinWindow(std::string_view timestamp, std::int64_t now_s) {
    std::int64_t seconds = 0;
    const char* end = timestamp.data() + timestamp.size();
    return !timestamp.empty() && timestamp.size() <= kMaxTimestampDigits &&
           timestamp.find_first_not_of("0123456789") == std::string_view::npos &&
           std::from_chars(timestamp.data(), end, seconds).ptr == end &&
           std::llabs(seconds - now_s) <= kPairTokenWindowSeconds;
}

}  // namespace

std::string MakePairToken(std::string_view secret, std::string_view timestamp) {
    return TokenCode(secret, std::string(kLabel).append(timestamp));
}

bool PairTokenMatches(std::string_view token, std::string_view timestamp, std::string_view secret, std::int64_t now_s) {
    return IsTokenKey(secret) && IsWithinWindow(timestamp, now_s) &&
           IsTokenCode(MakePairToken(secret, timestamp), token);
}

}  // namespace lookhaven::remote
