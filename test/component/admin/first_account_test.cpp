// SPDX-License-Identifier: Apache-2.0
//
// The first account: for how long a token is valid, that it makes one account only, and what the audit log tells of it.
#include "standalone/admin/first_account.h"

#include <atomic>

#include "standalone/store/audit_log.h"
#include "standalone/store/settings.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::Engine;
using store::EngineName;
using testing::HasSubstr;
using testing::Not;

constexpr std::int64_t kNow = 1'764'000'000;
constexpr std::int64_t kMinute = 60;

class FirstAccount : public store::StoreTest {
  protected:
    // "made", "invalid token", "bad name" or "has account".
    std::string Try(store::Store& store, const std::string& token, std::int64_t now_s,
                    const std::string& name = "ada") {
        try {
            AddFirstAccount(store, token, name, password_, "192.0.2.7", now_s);
            return "made";
        } catch (const InvalidToken&) {
            return "invalid token";
        } catch (const store::AlreadyExists&) {
            return "has account";
        } catch (const store::InvalidRecord&) {
            return "bad name";
        }
    }
    std::string Try(const std::string& token, std::int64_t now_s, const std::string& name = "ada") {
        return Try(store_, token, now_s, name);
    }

    const store::HashedPassword password_{"correct horse"};
    store::Users users_{store_};
};

TEST_P(FirstAccount, IsMadeByAValidTokenAlone) {
    EXPECT_EQ(Try("", kNow), "invalid token") << "none was given out";
    const std::string replaced = NewSetupToken(store_, kNow - kMinute);
    const std::string token = NewSetupToken(store_, kNow);
    ASSERT_EQ(token.size(), 48U);
    const struct {
        const char* attempt;
        std::string token;
        std::int64_t now_s;
        const char* name;
        const char* outcome;
    } rows[] = {
        {"the one before", replaced, kNow, "ada", "invalid token"},
        {"after its time", token, kNow + 15 * kMinute, "ada", "invalid token"},
        {"by a clock that was set back", token, kNow - 1, "ada", "invalid token"},
        {"without one", "", kNow, "ada", "invalid token"},
        {"a part of it", token.substr(1), kNow, "ada", "invalid token"},
        {"what the store has", store::Settings(store_).Find("setup_token").value(), kNow, "ada", "invalid token"},
        {"as what no account is called", token, kNow, "lookhaven", "bad name"},
        {"in its last second", token, kNow + 15 * kMinute - 1, "ada", "made"},
        {"once more", token, kNow, "eve", "has account"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Try(row.token, row.now_s, row.name), row.outcome) << row.attempt;
    }
    for (const std::string& bytes : store::kHostileTexts) {
        EXPECT_EQ(Try(bytes, kNow), "has account");
    }
    const auto ada = users_.CheckPassword("ada", "correct horse");
    ASSERT_TRUE(ada);
    EXPECT_EQ(ada->privilege, store::Privilege::kOwner);
    const std::vector<store::AuditEntry> entries = store::AuditLog(store_).List(0, 10);
    ASSERT_EQ(entries.size(), 1U);
    EXPECT_EQ(entries[0].action + " " + entries[0].who + " " + entries[0].address,
              "user.add one-time address 192.0.2.7");
    EXPECT_THAT(entries[0].after, Not(HasSubstr("horse")));
    EXPECT_THROW(NewSetupToken(store_, kNow), store::AlreadyExists);
    users_.Remove(ada->id);
    EXPECT_EQ(Try(token, kNow), "invalid token") << "used, though nobody has an account";
}

TEST_P(FirstAccount, IsOneHoweverManyTakeItsTokenAtOnce) {
    for (int round = 0; round < 5; ++round) {
        const std::string token = NewSetupToken(store_, kNow);
        std::atomic<int> next = 0;
        std::atomic<int> made = 0;
        InParallel(4, [&](store::Store& store) {
            const std::string name = "visitor" + std::to_string(next++);
            made += Try(store, token, kNow, name) == "made" ? 1 : 0;
        });
        EXPECT_EQ(made, 1);
        ASSERT_EQ(users_.List().size(), 1U);
        users_.Remove(users_.List().front().id);
    }
}

TEST_P(FirstAccount, HasATokenThatTheStoreDoesNotTell) {
    const std::string token = NewSetupToken(store_, kNow);
    EXPECT_THAT(store::Settings(store_).Find("setup_token").value(), Not(HasSubstr(token)));
    EXPECT_NE(token, NewSetupToken(store_, kNow));
    for (const std::string& bytes : store::kHostileTexts) {
        EXPECT_EQ(Try(bytes, kNow), "invalid token");
    }
}

LOOKHAVEN_ON_BOTH_ENGINES(FirstAccount);

}  // namespace
}  // namespace lookhaven::admin
