// SPDX-License-Identifier: Apache-2.0
//
// The token by which a paired host proves who it is.
#include "standalone/remote/pair_token.h"

#include <stdexcept>
#include <string>

#include <gtest/gtest.h>

namespace lookhaven::remote {
namespace {

const std::string kSecret(64, 'a');

TEST(PairToken, MatchesOnlyItsSecretItsTimestampAndItsTime) {
    constexpr std::int64_t kNow = 1'800'000'000;
    const std::string now = "1800000000";
    const std::string token = MakePairToken(kSecret, now);
    std::string flipped = token;
    flipped.back() = flipped.back() == '0' ? '1' : '0';
    const struct {
        std::string token, timestamp, secret;
        std::int64_t at;
        bool matches;
    } rows[] = {{token, now, kSecret, kNow, true},
                {token, now, kSecret, kNow + 300, true},
                {token, now, kSecret, kNow - 300, true},
                {token, now, kSecret, kNow + 301, false},
                {token, now, kSecret, kNow - 301, false},
                {token, "1800000001", kSecret, kNow, false},
                {token, now, std::string(64, 'b'), kNow, false},
                {flipped, now, kSecret, kNow, false},
                {token.substr(1), now, kSecret, kNow, false},
                {token, now, "", kNow, false},
                {"FailedCookie", "FailedTiemstamp", kSecret, kNow, false},
                {MakePairToken(kSecret, "FailedTiemstamp"), "FailedTiemstamp", kSecret, kNow, false},
                {MakePairToken(kSecret, "+1800000000"), "+1800000000", kSecret, kNow, false},
                {MakePairToken(kSecret, "99999999999999999999"), "99999999999999999999", kSecret, kNow, false},
                {MakePairToken(kSecret, ""), "", kSecret, 0, false}};
    for (const auto& row : rows) {
        EXPECT_EQ(PairTokenMatches(row.token, row.timestamp, row.secret, row.at), row.matches)
            << row.timestamp << " at " << row.at;
    }
    EXPECT_THROW(MakePairToken("", now), std::invalid_argument);
}

}  // namespace
}  // namespace lookhaven::remote
