// SPDX-License-Identifier: Apache-2.0
//
// Changes of doors, I/O modules and POS terminals: who may, what is refused, and what the audit log tells of it.
#include "standalone/admin/devices.h"

#include "standalone/admin/change.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using enum store::EmapItemType;
using store::Device;
using store::Engine;
using store::EngineName;
using testing::ElementsAre;
using testing::HasSubstr;

class DeviceAdminTest : public store::StoreTest {
  protected:
    static std::int64_t Revision(const Device& device) { return DeviceRecord(device)["revision"].asInt64(); }

    const Device module_{.kind = kIoModule, .name = "Box", .ports = {{0, {store::PortType::kInput, 1}}, {5, {}}}};
};

TEST_P(DeviceAdminTest, AreAuditedByTheirKind) {
    AddCamera();
    const Device door = AddDevice(store_, {}, {.kind = kDoor, .name = "Front door", .camera_id = 1});
    const Device box = AddDevice(store_, {}, module_);
    EXPECT_EQ(box.id, door.id) << "ids count within a kind";
    const Device changed =
        SetDevice(store_, {}, kIoModule, box.id, Revision(box), [](Device& edited) { edited.ports.erase(5); });
    EXPECT_EQ(changed.ports.size(), 1U);
    SetDevice(store_, {}, kIoModule, box.id, Revision(changed), [](Device&) {});
    RemoveDevice(store_, {}, kDoor, door.id, Revision(door));
    EXPECT_THAT(Audited(), ElementsAre(HasSubstr("door.remove Front door (1) {"), HasSubstr("io.set Box (1) {"),
                                       HasSubstr(R"("port":[{"camera":1,"port":0,"type":"in"},{)"),
                                       HasSubstr(R"(door.add Front door (1)  {"camera":1,"id":1,"idOnServer":1)")))
        << "what changes nothing leaves no row";
    EXPECT_FALSE(store::Devices(store_).Find(kDoor, door.id));
    EXPECT_TRUE(store::Devices(store_).Find(kIoModule, box.id));
    SetCameraPorts(store_, {}, 1, {.inputs = 2});
    EXPECT_EQ(Audited().front(),
              R"(camera.ports Gate (1) {"id":1,"inputs":0,"outputs":0} {"id":1,"inputs":2,"outputs":0})");
    store::Cameras(store_).Remove(1);
    EXPECT_THROW(SetCameraPorts(store_, {}, 1, {}), store::NotFound);
    EXPECT_EQ(SetDevice(store_, {}, kIoModule, box.id, {}, [](Device& edited) { edited.name = "Case"; }).name, "Case")
        << "a camera that was removed stays named";
}

TEST_P(DeviceAdminTest, AreRefusedWithoutATrace) {
    AddCamera();
    const Actor eve{store::Users(store_).Add("eve", "correct horse", store::Privilege::kViewer).id, "eve", ""};
    const Device box = AddDevice(store_, {}, module_);
    const std::int64_t seen = Revision(box);
    const auto rename = [](Device& edited) { edited.name = "Case"; };
    EXPECT_THROW(AddDevice(store_, eve, module_), Forbidden);
    EXPECT_THROW(SetDevice(store_, eve, kIoModule, box.id, {}, rename), Forbidden);
    EXPECT_THROW(RemoveDevice(store_, eve, kIoModule, box.id, {}), Forbidden);
    EXPECT_THROW(AddDevice(store_, {}, {.kind = kCamera, .name = "x"}), store::InvalidRecord);
    EXPECT_THROW(AddDevice(store_, {}, {.kind = kPos, .name = ""}), store::InvalidRecord);
    EXPECT_THROW(AddDevice(store_, {}, {.kind = kPos, .name = "x", .server_id = 9, .id_on_server = 1}),
                 store::NotFound);
    EXPECT_THROW(SetDevice(store_, {}, kDoor, box.id, {}, rename), store::NotFound);
    EXPECT_THROW(SetDevice(store_, {}, kIoModule, box.id, seen, [](Device& edited) { edited.ports[1].camera_id = 9; }),
                 store::NotFound);
    EXPECT_EQ(Audited().size(), 1U);
    SetDevice(store_, {}, kIoModule, box.id, {}, [](Device& edited) { edited.ports[0].camera_id = 0; });
    EXPECT_THROW(SetDevice(store_, {}, kIoModule, box.id, seen, rename), Stale);
    EXPECT_THROW(RemoveDevice(store_, {}, kIoModule, box.id, seen), Stale);
    EXPECT_EQ(store::Devices(store_).Find(kIoModule, box.id)->name, "Box");
}

LOOKHAVEN_ON_BOTH_ENGINES(DeviceAdminTest);

}  // namespace
}  // namespace lookhaven::admin
