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

constexpr std::int64_t kMinute = 60;

// So many seconds after the test's present.
base::BootTime At(std::int64_t later_s) {
    return {"this boot", 5000 + later_s};
}

class FirstAccount : public store::StoreTest {
  protected:
    // "made", "invalid token", "bad name" or "has account".
    std::string Try(store::Store& store, const std::string& token, const base::BootTime& now,
                    const std::string& name = "ada") {
        try {
            AddFirstAccount(store, token, name, password_, "192.0.2.7", now);
            return "made";
        } catch (const InvalidToken&) {
            return "invalid token";
        } catch (const store::AlreadyExists&) {
            return "has account";
        } catch (const store::InvalidRecord&) {
            return "bad name";
        }
    }
    std::string Try(const std::string& token, const base::BootTime& now, const std::string& name = "ada") {
        return Try(store_, token, now, name);
    }

    const store::HashedPassword password_{"correct horse"};
    store::Users users_{store_};
};

TEST_P(FirstAccount, IsMadeByAValidTokenAlone) {
    EXPECT_EQ(Try("", At(0)), "invalid token") << "none was given out";
    const std::string replaced = NewSetupToken(store_, At(-kMinute));
    const std::string token = NewSetupToken(store_, At(0));
    ASSERT_EQ(token.size(), 48U);
    const struct {
        const char* attempt;
        std::string token;
        base::BootTime now;
        const char* name;
        const char* outcome;
    } rows[] = {
        {"the one before", replaced, At(0), "ada", "invalid token"},
        {"after its time", token, At(15 * kMinute), "ada", "invalid token"},
        {"after a restart of the machine", token, {"another boot", 5000}, "ada", "invalid token"},
        {"without one", "", At(0), "ada", "invalid token"},
        {"a part of it", token.substr(1), At(0), "ada", "invalid token"},
        {"what the store has", store::Settings(store_).Find("setup_token").value(), At(0), "ada", "invalid token"},
        {"as what no account is called", token, At(0), "lookhaven", "bad name"},
        {"in its last second", token, At(15 * kMinute - 1), "ada", "made"},
        {"once more", token, At(0), "eve", "has account"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Try(row.token, row.now, row.name), row.outcome) << row.attempt;
    }
    for (const std::string& bytes : store::kHostileTexts) {
        EXPECT_EQ(Try(bytes, At(0)), "has account");
    }
    const auto ada = users_.CheckPassword("ada", "correct horse");
    ASSERT_TRUE(ada);
    EXPECT_EQ(ada->privilege, store::Privilege::kOwner);
    const std::vector<store::AuditEntry> entries = store::AuditLog(store_).List(0, 10);
    ASSERT_EQ(entries.size(), 1U);
    EXPECT_EQ(entries[0].action + " " + entries[0].who + " " + entries[0].address,
              "user.add one-time address 192.0.2.7");
    EXPECT_THAT(entries[0].after, Not(HasSubstr("horse")));
    EXPECT_THROW(NewSetupToken(store_, At(0)), store::AlreadyExists);
    users_.Remove(ada->id);
    EXPECT_EQ(Try(token, At(0)), "invalid token") << "used, though nobody has an account";
}

TEST_P(FirstAccount, IsOneHoweverManyTakeItsTokenAtOnce) {
    for (int round = 0; round < 5; ++round) {
        const std::string token = NewSetupToken(store_, At(0));
        std::atomic<int> next = 0;
        std::atomic<int> made = 0;
        InParallel(4, [&](store::Store& store) {
            const std::string name = "visitor" + std::to_string(next++);
            made += Try(store, token, At(0), name) == "made" ? 1 : 0;
        });
        EXPECT_EQ(made, 1);
        ASSERT_EQ(users_.List().size(), 1U);
        users_.Remove(users_.List().front().id);
    }
}

TEST_P(FirstAccount, HasATokenThatTheStoreDoesNotTell) {
    const std::string token = NewSetupToken(store_, At(0));
    EXPECT_THAT(store::Settings(store_).Find("setup_token").value(), Not(HasSubstr(token)));
    EXPECT_NE(token, NewSetupToken(store_, At(0)));
    for (const std::string& bytes : store::kHostileTexts) {
        EXPECT_EQ(Try(bytes, At(0)), "invalid token");
    }
}

LOOKHAVEN_ON_BOTH_ENGINES(FirstAccount);

}  // namespace
}  // namespace lookhaven::admin
