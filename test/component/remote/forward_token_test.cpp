// SPDX-License-Identifier: Apache-2.0
//
// What proves that another host of the store has passed a request on.
#include "standalone/remote/forward_token.h"

#include <gtest/gtest.h>

#include "standalone/remote/token_code.h"

namespace lookhaven::remote {
namespace {

constexpr std::int64_t kNow = 1'700'000'000;
const std::string kKey(64, 'a');
const std::string kOtherKey(64, 'b');

TEST(ForwardToken, IsTakenByTheHostItIsForWhileItsTimeIsNear) {
    const std::string token = MakeForwardToken(kKey, 2, "2001:db8::7", kNow);
    const struct {
        const char* what;
        std::string token;
        std::string key;
        int host;
        std::int64_t now_s;
        bool is_taken;
    } rows[] = {
        {"true", token, kKey, 2, kNow, true},
        {"sent again", token, kKey, 2, kNow + 1, true},
        {"of a clock that is five minutes behind", token, kKey, 2, kNow + 300, true},
        {"of a clock that is five minutes ahead", token, kKey, 2, kNow - 300, true},
        {"expired", token, kKey, 2, kNow + 301, false},
        {"of the future", token, kKey, 2, kNow - 301, false},
        {"at a host whose clock began anew", token, kKey, 2, 0, false},
        {"for another host", token, kKey, 3, kNow, false},
        {"for a host whose number begins alike", token, kKey, 22, kNow, false},
        {"of another installation", token, kOtherKey, 2, kNow, false},
        {"of an installation without a key", token, "", 2, kNow, false},
        {"without its code", token.substr(0, token.size() - kTokenCodeDigits), kKey, 2, kNow, false},
        {"cut", token.substr(0, token.size() - 1), kKey, 2, kNow, false},
        {"longer", token + "0", kKey, 2, kNow, false},
        {"in capitals", token.substr(0, token.size() - 1) + "G", kKey, 2, kNow, false},
        {"empty", "", kKey, 2, kNow, false},
        {"endless", std::string(1 << 20, '0'), kKey, 2, kNow, false},
        {"of another client", "1700000000 192.0.2.1 " + token.substr(token.size() - kTokenCodeDigits), kKey, 2, kNow,
         false},
    };
    for (const auto& row : rows) {
        const auto client = ClientInForwardToken(row.token, row.key, row.host, row.now_s);
        EXPECT_EQ(client, row.is_taken ? std::optional<std::string>("2001:db8::7") : std::nullopt) << row.what;
    }
}

TEST(ForwardToken, IsNoOtherKindOfTokenOfTheSameKey) {
    const std::string said = "1700000000 192.0.2.7 ";
    for (const char* label : {"", "lookhaven pair 1\n", "lookhaven forward 2\n2\n", "lookhaven forward 1\n"}) {
        EXPECT_EQ(ClientInForwardToken(said + TokenCode(kKey, label + said), kKey, 2, kNow), std::nullopt) << label;
    }
}

TEST(HostToken, NamesAHostAndIsNoForwardToken) {
    const std::string token = HostTokenLine(kKey, 2, 3, kNow).substr(kHostHeader.size() + 2);
    EXPECT_EQ(HostInToken(token, kKey, 2, kNow), 3);
    EXPECT_EQ(HostInToken(token, kKey, 3, kNow), std::nullopt);
    EXPECT_EQ(ClientInForwardToken(token, kKey, 2, kNow), std::nullopt);
    EXPECT_EQ(HostInToken(MakeForwardToken(kKey, 2, "3", kNow), kKey, 2, kNow), std::nullopt);
    EXPECT_EQ(HostInToken(HostTokenLine(kKey, 2, -3, kNow).substr(kHostHeader.size() + 2), kKey, 2, kNow),
              std::nullopt);
}

TEST(ForwardToken, TimesThatAreNoneAreRefusedThoughTheKeyHasSignedThem) {
    for (const std::string said : {"", " ", "x 192.0.2.7 ", "-1 192.0.2.7 ", "+1700000000 192.0.2.7 ",
                                   "1700000000x 192.0.2.7 ", "99999999999999999999 192.0.2.7 ", "1700000000"}) {
        const std::string code = TokenCode(kKey, "lookhaven forward 1\n2\n" + said);
        EXPECT_EQ(ClientInForwardToken(said + code, kKey, 2, kNow), std::nullopt) << said;
    }
}

}  // namespace
}  // namespace lookhaven::remote
