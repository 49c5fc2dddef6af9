// SPDX-License-Identifier: Apache-2.0
//
// What accounts prefer: merged by name, bounded, kept apart, and gone with the account.
#include "standalone/admin/preferences.h"

#include <atomic>
#include <sstream>

#include "standalone/base/json_text.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::Engine;
using store::EngineName;

Json::Value Parsed(const std::string& text) {
    Json::Value json;
    std::istringstream(text) >> json;
    return json;
}

std::string Nested(int depth) {
    return std::string(static_cast<std::size_t>(depth), '[') + "1" + std::string(static_cast<std::size_t>(depth), ']');
}

std::string Members(int count) {
    std::string text;
    for (int i = 0; i < count; ++i) {
        text += (i == 0 ? "{\"p" : ", \"p") + std::to_string(i) + "\": true";
    }
    return text + "}";
}

class PreferencesTest : public store::StoreTest {
  protected:
    int AddAccount(const char* name) { return users_.Add(name, password_, store::Privilege::kViewer).id; }
    std::string Stored(int id) { return base::OneLineJson(PreferencesOf(store_, id)); }

    store::HashedPassword password_{"correct horse"};
    store::Users users_{store_};
    int bob_ = AddAccount("bob");
};

TEST_P(PreferencesTest, AreMergedByNameAndWhatIsRefusedChangesNothing) {
    const struct {
        const char* what;
        std::string changes;
        bool is_taken;
        std::string then;
    } rows[] = {
        {"the first ones", R"({"layout": "2", "order": [3, 1], "sub": {"a": 1, "b": 2}})", true,
         R"({"layout":"2","order":[3,1],"sub":{"a":1,"b":2}})"},
        {"one of them", R"({"order": []})", true, R"({"layout":"2","order":[],"sub":{"a":1,"b":2}})"},
        {"values are replaced as a whole", R"({"sub": {"b": null}})", true,
         R"({"layout":"2","order":[],"sub":{"b":null}})"},
        {"null removes", R"({"layout": null, "sub": null, "unknown": null})", true, R"({"order":[]})"},
        {"nothing", "{}", true, R"({"order":[]})"},
        {"text of all scripts", R"({"übersicht": "日本 \u0007 ' or '1'='1"})", true,
         R"({"order":[],"\u00fcbersicht":"\u65e5\u672c \u0007 ' or '1'='1"})"},
        {"not an object", R"(["layout"])", false, ""},
        {"a text", R"("layout")", false, ""},
        {"null", "null", false, ""},
        {"no name", R"({"": 1, "order": [1]})", false, ""},
        {"a name with a control character", R"({"a\nb": 1})", false, ""},
        {"a name that is too long", "{\"" + std::string(65, 'a') + R"(": 1})", false, ""},
        {"too deep", R"({"deep": )" + Nested(kMaxPreferenceDepth + 1) + "}", false, ""},
        {"as deep as it may be", R"({"deep": )" + Nested(kMaxPreferenceDepth) + R"(, "übersicht": null})", true,
         R"({"deep":)" + Nested(kMaxPreferenceDepth) + R"(,"order":[]})"},
        {"too large", R"({"a": ")" + std::string(kMaxPreferencesBytes, 'a') + "\"}", false, ""},
        {"too many", Members(kMaxPreferences - 1), false, ""},
        {"as many as there may be", Members(kMaxPreferences - 2), true, ""},
    };
    std::string now = Stored(bob_);
    EXPECT_EQ(now, "{}");
    for (const auto& row : rows) {
        if (row.is_taken) {
            now = base::OneLineJson(SetPreferences(store_, bob_, Parsed(row.changes)));
            if (!row.then.empty()) {
                EXPECT_EQ(now, row.then) << row.what;
            }
        } else {
            EXPECT_THROW(SetPreferences(store_, bob_, Parsed(row.changes)), store::InvalidRecord) << row.what;
        }
        EXPECT_EQ(Stored(bob_), now) << row.what;
    }
    EXPECT_EQ(PreferencesOf(store_, bob_).size(), kMaxPreferences);
    EXPECT_THAT(Audited(), testing::IsEmpty()) << "no change of the installation";
}

TEST_P(PreferencesTest, AreThoseOfTheAccountAndGoWithIt) {
    const int eve = AddAccount("eve");
    SetPreferences(store_, bob_, Parsed(R"({"layout": "2"})"));
    EXPECT_EQ(Stored(eve), "{}");
    SetPreferences(store_, eve, Parsed(R"({"layout": "3"})"));
    users_.Remove(eve);
    EXPECT_EQ(Ask("select user_id from preferences"), std::to_string(bob_));
    EXPECT_EQ(Stored(eve), "{}");
    EXPECT_THROW(SetPreferences(store_, eve, Parsed(R"({"layout": "3"})")), store::NotFound);
    Force("update preferences set value = '[1'");
    EXPECT_EQ(Stored(bob_), "{}") << "a damaged record";
}

TEST_P(PreferencesTest, OfManyClientsAtOnceNoneUndoesAnothersChange) {
    constexpr int kClients = 4;
    std::atomic<int> next = 0;
    InParallel(kClients, [&](store::Store& store) {
        const std::string name = "client" + std::to_string(next++);
        for (int i = 0; i < 10; ++i) {
            Json::Value changes;
            changes[name + "/" + std::to_string(i)] = i;
            SetPreferences(store, bob_, changes);
        }
    });
    EXPECT_EQ(PreferencesOf(store_, bob_).size(), 10U * kClients);
}

LOOKHAVEN_ON_BOTH_ENGINES(PreferencesTest);

}  // namespace
}  // namespace lookhaven::admin
