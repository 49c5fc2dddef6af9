// SPDX-License-Identifier: Apache-2.0
//
// Changes of camera groups: who may, what is refused, and what the audit log tells of it.
#include "standalone/admin/groups.h"

#include "standalone/admin/change.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::CameraGroup;
using store::Engine;
using store::EngineName;
using testing::ElementsAre;

class GroupAdminTest : public store::StoreTest {
  protected:
    std::int64_t Revision(int id) {
        return GroupRecord(store_, store::Groups(store_).Find(id).value())["revision"].asInt64();
    }
};

TEST_P(GroupAdminTest, AreAuditedWithWhomTheyKeptOut) {
    AddCamera();
    store::Users users(store_);
    const int viewer = users.Add("eve", "correct horse", store::Privilege::kViewer).id;
    const CameraGroup group = AddGroup(store_, {}, {0, "Yard", {1}});
    SetGroup(store_, {}, group.id, Revision(group.id), [](CameraGroup& edited) { edited.name = "Court"; });
    const std::int64_t seen = Revision(group.id);
    users.DenyGroup(viewer, group.id, {store::CameraAccess::kAudio});
    EXPECT_THROW(RemoveGroup(store_, {}, group.id, seen), Stale) << "nobody was shown whom it keeps out";
    RemoveGroup(store_, {}, group.id, Revision(group.id));
    EXPECT_THAT(
        Audited(),
        ElementsAre(
            R"(group.remove Court (1) {"camera":[1],"deniedTo":["eve"],"id":1,"name":"Court"} )",
            R"(group.set Court (1) {"camera":[1],"deniedTo":[],"id":1,"name":"Yard"} {"camera":[1],"deniedTo":[],"id":1,"name":"Court"})",
            R"(group.add Yard (1)  {"camera":[1],"deniedTo":[],"id":1,"name":"Yard"})"));
}

TEST_P(GroupAdminTest, AreRefusedWithoutATrace) {
    AddCamera();
    const Actor eve{store::Users(store_).Add("eve", "correct horse", store::Privilege::kViewer).id, "eve", ""};
    const CameraGroup group = AddGroup(store_, {}, {0, "Yard", {1}});
    const std::int64_t seen = Revision(group.id);
    const auto rename = [](CameraGroup& edited) { edited.name = "Court"; };
    EXPECT_THROW(AddGroup(store_, eve, {0, "Mine", {}}), Forbidden);
    EXPECT_THROW(SetGroup(store_, eve, group.id, {}, rename), Forbidden);
    EXPECT_THROW(RemoveGroup(store_, eve, group.id, {}), Forbidden);
    EXPECT_THROW(AddGroup(store_, {}, {0, "Yard", {}}), store::AlreadyExists);
    EXPECT_THROW(AddGroup(store_, {}, {0, "Court", {99}}), store::NotFound);
    EXPECT_THROW(SetGroup(store_, {}, 99, {}, rename), store::NotFound);
    EXPECT_THROW(SetGroup(store_, {}, group.id, seen, [](CameraGroup& edited) { edited.camera_ids.insert(99); }),
                 store::NotFound);
    EXPECT_EQ(Audited().size(), 1U);
    SetGroup(store_, {}, group.id, {}, [](CameraGroup& edited) { edited.camera_ids.clear(); });
    EXPECT_THROW(SetGroup(store_, {}, group.id, seen, rename), Stale);
    EXPECT_THROW(RemoveGroup(store_, {}, group.id, seen), Stale);
    EXPECT_EQ(store::Groups(store_).Find(group.id)->name, "Yard");
    EXPECT_EQ(Audited().size(), 2U);
}

LOOKHAVEN_ON_BOTH_ENGINES(GroupAdminTest);

}  // namespace
}  // namespace lookhaven::admin
