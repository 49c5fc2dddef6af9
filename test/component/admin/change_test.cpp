// SPDX-License-Identifier: Apache-2.0
//
// What every change goes through: who may, what the audit log says, and what a stale record is told.
#include "standalone/admin/change.h"

#include "standalone/store/audit_log.h"
#include "standalone/store/settings.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::Engine;
using store::EngineName;
using testing::ElementsAre;
using testing::IsEmpty;

class ChangeTest : public store::StoreTest {
  protected:
    Change Set(const std::string& value) {
        store::Settings settings(store_);
        Json::Value before;
        before["place"] = settings.Find("place").value_or("");
        settings.Set("place", value);
        Json::Value after;
        after["place"] = value;
        return {"setting.set", "place", before, after};
    }

    std::vector<std::string> Entries(int before_id, int limit) {
        std::vector<std::string> texts;
        for (const store::AuditEntry& entry : store::AuditLog(store_).List(before_id, limit)) {
            texts.push_back(std::to_string(entry.id) + " " + entry.who + "@" + entry.address + " " + entry.action +
                            " " + entry.object + " " + entry.before + entry.after);
        }
        return texts;
    }
};

TEST_P(ChangeTest, IsInTheAuditLogOrDidNotHappen) {
    Apply(store_, {}, [this] { return Set("yard"); });
    Apply(store_, {}, [this] { return Set("yard"); });
    EXPECT_THROW(Apply(store_, {}, [this] { return Set("shed"), throw store::NotFound(""), Change(); }),
                 store::NotFound);
    EXPECT_EQ(store::Settings(store_).Find("place"), "yard");
    const int bob = store::Users(store_).Add("bob", "correct horse", store::Privilege::kManager).id;
    Apply(store_, {bob, "bob", "192.0.2.7"}, [this] { return Set(std::string(20'000, 'x')); });
    EXPECT_THAT(Entries(0, 9), ElementsAre(R"(2 bob@192.0.2.7 setting.set place {"place":"yard"}{"tooLarge":20012})",
                                           R"(1 command line@ setting.set place {"place":""}{"place":"yard"})"));
    EXPECT_THAT(Entries(2, 9).size(), 1) << "those before";
    EXPECT_THAT(Entries(0, 1).size(), 1);
}

TEST_P(ChangeTest, IsRefusedToWhoeverIsNoManager) {
    store::Users users(store_);
    const int viewer = users.Add("eve", "correct horse", store::Privilege::kViewer).id;
    const int removed = users.Add("bob", "correct horse", store::Privilege::kOwner).id;
    users.Remove(removed);
    for (const int user : {viewer, removed, 99}) {
        EXPECT_THROW(Apply(store_, {user, "eve", ""}, [this] { return Set("shed"); }), Forbidden) << user;
    }
    EXPECT_EQ(store::Settings(store_).Find("place"), std::nullopt);
    EXPECT_THAT(Entries(0, 9), IsEmpty());
}

TEST_P(ChangeTest, OfAStaleRecordIsToldTheCurrentOne) {
    Json::Value record;
    record["name"] = "Gate";
    const std::int64_t seen = RevisionOf(record);
    record["revision"] = Json::Int64{seen};
    RequireCurrent(record, seen);
    RequireCurrent(record, std::nullopt);
    record["name"] = "Yard";
    record["revision"] = Json::Int64{RevisionOf(record)};
    try {
        RequireCurrent(record, seen);
        ADD_FAILURE() << "it has changed";
    } catch (const Stale& stale) {
        EXPECT_EQ(stale.Record(), record);
    }
    EXPECT_EQ(RevisionOf(record), record["revision"].asInt64()) << "the revision does not cover itself";
    EXPECT_LT(RevisionOf(record), std::int64_t{1} << 48);
}

TEST_P(ChangeTest, TheOldestEntriesMakeRoom) {
    store::AuditLog log(store_, 3);
    for (int i = 0; i < 5; ++i) {
        log.Add({.action = "x"});
    }
    EXPECT_EQ(log.List(0, 9).size(), 3);
    EXPECT_EQ(log.List(0, 9).back().id, 3);
}

LOOKHAVEN_ON_BOTH_ENGINES(ChangeTest);

}  // namespace
}  // namespace lookhaven::admin
