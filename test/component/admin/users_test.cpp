// SPDX-License-Identifier: Apache-2.0
//
// Changes of accounts: who may make which, that an owner stays, and what the audit log tells of a password.
#include "standalone/admin/users.h"

#include <atomic>
#include <sstream>

#include "standalone/admin/change.h"
#include "standalone/admin/user_record.h"
#include "standalone/base/clock.h"
#include "standalone/store/audit_log.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::CameraAccess;
using store::Engine;
using store::EngineName;
using store::Privilege;
using testing::ElementsAre;
using testing::IsEmpty;

class UserTest : public store::StoreTest {
  protected:
    Actor AddAccount(const std::string& name, Privilege privilege) {
        return {users_.Add(name, password_, privilege).id, name, "192.0.2.7"};
    }
    Privilege PrivilegeOf(const Actor& actor) { return users_.Find(actor.user_id)->privilege; }

    // "refused", "needed", "stale", "invalid", or "done".
    static std::string Outcome(const std::function<void()>& change) {
        try {
            change();
            return "done";
        } catch (const Forbidden&) {
            return "refused";
        } catch (const StillNeeded&) {
            return "needed";
        } catch (const Stale&) {
            return "stale";
        } catch (const store::InvalidRecord&) {
            return "invalid";
        } catch (const store::NotFound&) {
            return "absent";
        }
    }

    store::HashedPassword password_{"correct horse"};
    store::Users users_{store_};
    Actor owner_ = AddAccount("owner", Privilege::kOwner);
    Actor manager_ = AddAccount("manager", Privilege::kManager);
    Actor viewer_ = AddAccount("viewer", Privilege::kViewer);
};

TEST_P(UserTest, NobodyGetsMoreThanHeMayGiveAndAnOwnerStays) {
    const Actor console;
    const auto set = [&](const Actor& who, const Actor& whom, Privilege privilege) {
        return [=, this] { SetUser(store_, who, whom.user_id, {}, {.privilege = privilege}); };
    };
    const auto add = [&](const Actor& who, const std::string& name, Privilege privilege) {
        return [=, this] { AddUser(store_, who, name, {.password = password_, .privilege = privilege}); };
    };
    const auto remove = [&](const Actor& who, const Actor& whom) {
        return [=, this] { RemoveUser(store_, who, whom.user_id, {}); };
    };
    const struct {
        const char* change;
        std::function<void()> make;
        const char* outcome;
    } rows[] = {
        {"a viewer adds", add(viewer_, "a", Privilege::kViewer), "refused"},
        {"a manager makes an owner", add(manager_, "b", Privilege::kOwner), "refused"},
        {"a manager makes himself one", set(manager_, manager_, Privilege::kOwner), "refused"},
        {"a manager demotes an owner", set(manager_, owner_, Privilege::kViewer), "refused"},
        {"a manager removes an owner", remove(manager_, owner_), "refused"},
        {"a manager takes an owner's account over",
         [this] { SetUser(store_, manager_, owner_.user_id, {}, {.password = password_}); }, "refused"},
        {"a manager ends an owner's sessions", [this] { EndSessions(store_, manager_, owner_.user_id, {}, ""); },
         "refused"},
        {"a viewer ends a manager's sessions", [this] { EndSessions(store_, viewer_, manager_.user_id, {}, ""); },
         "refused"},
        {"a viewer ends those of nobody", [this] { EndSessions(store_, viewer_, 99, {}, ""); }, "refused"},
        {"the last owner demotes himself", set(owner_, owner_, Privilege::kManager), "needed"},
        {"the last owner is removed", remove(console, owner_), "needed"},
        {"a manager removes himself", remove(manager_, manager_), "needed"},
        {"a manager may report in any case",
         [this] { SetUser(store_, owner_, manager_.user_id, {}, {.may_mark = false}); }, "invalid"},
        {"no such camera",
         [this] {
             SetUser(store_, owner_, viewer_.user_id, {},
                     {.denials = [](auto& denials) { denials.cameras[CameraAccess::kLive] = {99}; }});
         },
         "absent"},
        {"a name twice", add(manager_, "VIEWER", Privilege::kViewer), "invalid"},
        {"a stale record", [this] { RemoveUser(store_, owner_, viewer_.user_id, 1); }, "stale"},
        {"a manager adds a manager", add(manager_, "c", Privilege::kManager), "done"},
        {"an owner makes an owner", set(owner_, manager_, Privilege::kOwner), "done"},
        {"and may go then", set(owner_, owner_, Privilege::kViewer), "done"},
        {"and be removed", remove(manager_, owner_), "done"},
        {"who is gone changes nothing", add(owner_, "d", Privilege::kViewer), "refused"},
    };
    for (const auto& row : rows) {
        const std::size_t entries = store::AuditLog(store_).List(0, 100).size();
        EXPECT_EQ(Outcome(row.make), row.outcome) << row.change;
        EXPECT_EQ(store::AuditLog(store_).List(0, 100).size() - entries, row.outcome == std::string("done") ? 1U : 0U)
            << row.change;
    }
}

TEST_P(UserTest, OfTwoOwnersWhoDemoteEachOtherAtOnceOneStays) {
    for (int round = 0; round < 5; ++round) {
        const Actor other = AddAccount("other" + std::to_string(round), Privilege::kOwner);
        std::atomic<int> next = 0;
        InParallel(2, [&](store::Store& store) {
            const Actor& whom = next++ == 0 ? owner_ : other;
            Outcome([&] { SetUser(store, {}, whom.user_id, {}, {.privilege = Privilege::kViewer}); });
        });
        EXPECT_NE(PrivilegeOf(owner_) == Privilege::kOwner, PrivilegeOf(other) == Privilege::kOwner) << round;
        users_.SetPrivilege(owner_.user_id, Privilege::kOwner);
        users_.SetPrivilege(other.user_id, Privilege::kViewer);
    }
}

TEST_P(UserTest, AManagerStaysOneUntilHisChangeIsMade) {
    std::atomic<bool> demoted = false;
    std::jthread other;
    Apply(store_, manager_, [&] {
        other = std::jthread([&] {
            store::Store store = store::Store::Open(url_);
            SetUser(store, {}, manager_.user_id, {}, {.privilege = Privilege::kViewer});
            demoted = true;
        });
        std::this_thread::sleep_for(std::chrono::milliseconds(200));
        EXPECT_FALSE(demoted);
        return Change();
    });
    other.join();
    EXPECT_EQ(PrivilegeOf(manager_), Privilege::kViewer);
}

TEST_P(UserTest, TheAuditLogTellsOfAPasswordAndNeverWhichOne) {
    SetUser(store_, manager_, viewer_.user_id, {}, {.password = store::HashedPassword("battery staple")});
    ChangePassword(store_, "192.0.2.9", *users_.CheckPassword("viewer", "battery staple"), password_, "");
    EXPECT_TRUE(users_.CheckPassword("viewer", "correct horse"));
    std::string told;
    for (const store::AuditEntry& entry : store::AuditLog(store_).List(0, 9)) {
        told += entry.who + "@" + entry.address + " " + entry.action + " " + entry.object + ";";
        EXPECT_THAT(entry.after, testing::HasSubstr(R"("password":"new")"));
        for (const char* secret : {"battery", "argon2", "horse"}) {
            EXPECT_THAT(entry.before + entry.after, testing::Not(testing::HasSubstr(secret)));
        }
    }
    EXPECT_EQ(told, "viewer@192.0.2.9 user.changePassword viewer (3);manager@192.0.2.7 user.set viewer (3);");
}

TEST_P(UserTest, DenialsAreReplacedAsAWholeOrNotAtAll) {
    const int camera = AddCamera();
    const auto parse = [](const char* text) {
        Json::Value json;
        std::istringstream(text) >> json;
        return json;
    };
    const auto deny = [&](const char* text) {
        return [json = parse(text)](store::Denials& denials) { denials = DenialsFrom(json); };
    };
    const Json::Value record =
        SetUser(store_, {}, viewer_.user_id, {}, {.denials = deny(R"({"live": [1], "audio": [1], "door": [7]})")});
    EXPECT_THAT(users_.DeniedCameras(viewer_.user_id, CameraAccess::kLive), ElementsAre(camera));
    EXPECT_EQ(Outcome([&] {
                  SetUser(store_, {}, viewer_.user_id, {},
                          {.privilege = Privilege::kManager, .denials = deny(R"({"group": {"live": [9]}})")});
              }),
              "absent");
    EXPECT_EQ(record, UserRecord(store_, *users_.Find(viewer_.user_id))) << "nothing of it was done";
    store::Cameras(store_).Remove(camera);
    SetUser(store_, {}, viewer_.user_id, record["revision"].asInt64(), {.denials = deny(R"({"live": [1]})")});
    EXPECT_THAT(users_.DeniedCameras(viewer_.user_id, CameraAccess::kLive), ElementsAre(1)) << "its footage is there";
    EXPECT_THAT(users_.DeniedCameras(viewer_.user_id, CameraAccess::kAudio), IsEmpty());
    const auto deny_doors = [&](int count) {
        return Outcome([&] {
            SetUser(store_, {}, viewer_.user_id, {}, {.denials = [count](store::Denials& denials) {
                        for (int id = 1; id <= count; ++id) {
                            denials.items[store::DeniableItem::kDoor].insert(id);
                        }
                    }});
        });
    };
    EXPECT_EQ(deny_doors(1'001), "invalid");
    EXPECT_EQ(deny_doors(1'000), "done");
    for (const char* wrong : {"[]", "5", R"({"live": 1})", R"({"live": [0]})", R"({"live": ["1"]})", R"({"liv": [1]})",
                              R"({"group": []})", R"({"group": {"door": [1]}})", R"({"emap": [1.5]})"}) {
        EXPECT_THROW(DenialsFrom(parse(wrong)), store::InvalidRecord) << wrong;
    }
}

TEST_P(UserTest, SessionsAreOfOnesOwnOrForManagers) {
    const Actor console;
    store::Sessions sessions(store_);
    const auto log_in = [&](const Actor& who) { return sessions.Create(who.user_id, base::WallSeconds()).handle; };
    for (const Actor* who : {&owner_, &manager_, &viewer_, &viewer_, &viewer_}) {
        log_in(*who);
    }
    const std::string kept = log_in(viewer_);
    const struct {
        Actor who;
        Actor whose;
        const char* seen;
    } rows[] = {
        {viewer_, viewer_, "4"},          {viewer_, manager_, "refused"}, {viewer_, Actor{99}, "refused"},
        {manager_, viewer_, "4"},         {manager_, owner_, "1"},        {manager_, Actor{99}, "absent"},
        {Actor{99}, Actor{99}, "absent"}, {console, viewer_, "4"},
    };
    for (const auto& row : rows) {
        std::size_t count = 0;
        const std::string outcome = Outcome([&] { count = SessionsOf(store_, row.who, row.whose.user_id).size(); });
        EXPECT_EQ(outcome == "done" ? std::to_string(count) : outcome, row.seen)
            << row.who.name << " of " << row.whose.user_id;
    }
    EXPECT_EQ(EndSessions(store_, viewer_, viewer_.user_id, sessions.OfUser(owner_.user_id, 0).front().handle, kept),
              0);
    EXPECT_THAT(Audited(), IsEmpty()) << "nothing has ended";
    EXPECT_EQ(EndSessions(store_, viewer_, viewer_.user_id, {}, kept), 3);
    EXPECT_THAT(Audited(), ElementsAre(R"(user.endSessions viewer (3)  {"ended":3})"));
    EXPECT_THAT(SessionsOf(store_, viewer_, viewer_.user_id), testing::SizeIs(1));
}

TEST_P(UserTest, ExportsAreDeniedByThemselvesAndWithPlayback) {
    for (int i = 0; i < 3; ++i) {
        AddCamera();
    }
    SetUser(store_, {}, viewer_.user_id, {}, {.denials = [](store::Denials& denials) {
                denials.cameras = {{CameraAccess::kExport, {1}}, {CameraAccess::kPlayback, {2}}};
            }});
    std::string seen;
    for (const VisibleCamera& camera : CamerasAsSeenBy(store_, viewer_.user_id)) {
        seen += std::string(camera.playback ? "plays" : "") + (camera.exported ? "exports" : "") + ";";
    }
    EXPECT_EQ(seen, "plays;;playsexports;");
    const store::AuditEntry entry = store::AuditLog(store_).List(0, 1).at(0);
    EXPECT_THAT(entry.after, testing::HasSubstr(R"("export":[1])"));
}

LOOKHAVEN_ON_BOTH_ENGINES(UserTest);

}  // namespace
}  // namespace lookhaven::admin
