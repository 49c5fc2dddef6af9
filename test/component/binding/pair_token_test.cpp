// SPDX-License-Identifier: Apache-2.0
//
// Which tokens prove that another host knows the secret.
#include "standalone/binding/pair_token.h"

#include <gtest/gtest.h>

namespace lookhaven::binding {
namespace {

TEST(PairToken, MatchesOnlyItsSecretItsTimestampAndItsTime) {
    const std::string secret(64, 'a');
    constexpr std::int64_t kNow = 1'800'000'000;
    const std::string now = "1800000000";
    const std::string token = MakePairToken(secret, now);
    std::string flipped = token;
    flipped.back() = flipped.back() == '0' ? '1' : '0';
    const struct {
        std::string token, timestamp, secret;
        std::int64_t at;
        bool matches;
    } rows[] = {{token, now, secret, kNow, true},
                {token, now, secret, kNow + 300, true},
                {token, now, secret, kNow - 300, true},
                {token, now, secret, kNow + 301, false},
                {token, now, secret, kNow - 301, false},
                {token, "1800000001", secret, kNow, false},
                {token, now, std::string(64, 'b'), kNow, false},
                {flipped, now, secret, kNow, false},
                {token.substr(1), now, secret, kNow, false},
                {token, now, "", kNow, false},
                {"FailedCookie", "FailedTiemstamp", secret, kNow, false},
                {MakePairToken(secret, "FailedTiemstamp"), "FailedTiemstamp", secret, kNow, false},
                {MakePairToken(secret, "+1800000000"), "+1800000000", secret, kNow, false},
                {MakePairToken(secret, "99999999999999999999"), "99999999999999999999", secret, kNow, false},
                {MakePairToken(secret, ""), "", secret, 0, false}};
    for (const auto& row : rows) {
        EXPECT_EQ(PairTokenMatches(row.token, row.timestamp, row.secret, row.at), row.matches)
            << row.timestamp << " at " << row.at;
    }
    EXPECT_THROW(MakePairToken("", now), std::invalid_argument);
}

}  // namespace
}  // namespace lookhaven::binding
