// SPDX-License-Identifier: Apache-2.0
//
// E-maps, the devices on them, and the hosts that this one is paired with.
#include "standalone/store/emaps.h"

#include "standalone/store/devices.h"
#include "standalone/store/servers.h"
#include "standalone/store/settings.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

const std::string kSecret(64, 'a');
const std::string kCertificate = "-----BEGIN CERTIFICATE-----\nAA==\n-----END CERTIFICATE-----\n";

class EmapTest : public StoreTest {
  protected:
    int AddMap(const std::string& name) { return emaps_.Add({.name = name}); }
    int AddServer(const std::string& name = "Annex") {
        return servers_.Add({.name = name, .address = "192.0.2.7", .port = 8443, .certificate = kCertificate}, kSecret);
    }
    // What a change of all items made of it.
    int Replace(int id, std::vector<EmapItem> items) { return emaps_.ReplaceItems(*emaps_.Find(id), items); }

    Emaps emaps_{store_};
    Devices devices_{store_};
    RecordingServers servers_{store_};
};

TEST_P(EmapTest, ItemsComeBackAsTheyWerePutAndOnlyOnTopOfWhatWasRead) {
    const int map = AddMap("Ground floor");
    const int other = AddMap("Upper floor");
    AddCamera();
    const EmapItem camera{EmapItemType::kCamera, 1, "Gate 門 '; --", 0, -5, 99'999, 359, 3, -7, 8, 255};
    const EmapItem link{.type = EmapItemType::kEmap, .device_id = other};
    EXPECT_EQ(Replace(map, {link, camera, camera}), 2);
    EXPECT_THAT(emaps_.Items(map), ElementsAre(link, camera, camera)) << "in their order";
    EXPECT_EQ(emaps_.List().front().item_count, 3);
    const Emap stale{.id = map, .name = "", .image = "", .hide_names = true, .revision = 1};
    const std::int64_t before = Settings(store_).Revision();
    EXPECT_THROW(emaps_.ReplaceItems(stale, {}), Conflict);
    EXPECT_EQ(Settings(store_).Revision(), before);
    EXPECT_FALSE(emaps_.Find(map)->hide_names);
    Emap fresh = *emaps_.Find(map);
    fresh.hide_names = fresh.small_items = true;
    EXPECT_EQ(emaps_.ReplaceItems(fresh, {link}), 3);
    EXPECT_TRUE(emaps_.Find(map)->hide_names && emaps_.Find(map)->small_items);
    emaps_.Remove(other);
    EXPECT_EQ(Replace(map, {link}), 4) << "an item whose target is gone blocks no change of the others";
    EXPECT_THROW(emaps_.ReplaceItems({.id = 99}, {}), NotFound);
    emaps_.Remove(map);
    EXPECT_EQ(Ask("select count(*) from emap_items"), "0");
    EXPECT_EQ(AddMap("Ground floor"), 3) << "no id is given twice";
}

TEST_P(EmapTest, WhatBreaksARuleChangesNothing) {
    const int map = AddMap("Ground floor");
    AddCamera();
    const EmapItem good{.device_id = 1};
    Replace(map, {good});
    const auto with = [&](auto member, auto value) { return With(good, member, value); };
    for (const EmapItem& item :
         {with(&EmapItem::type, EmapItemType(5)), with(&EmapItem::type, EmapItemType(-1)),
          with(&EmapItem::name, std::string(256, 'n')), with(&EmapItem::name, std::string("a\nb")),
          with(&EmapItem::x, 100'001), with(&EmapItem::y, -2'147'483'647 - 1), with(&EmapItem::direction, 360),
          with(&EmapItem::direction, -1), with(&EmapItem::text_pos, 4), with(&EmapItem::icon_center_x, 100'001),
          with(&EmapItem::port, -2), with(&EmapItem::port, 256)}) {
        EXPECT_THROW(Replace(map, {good, item}), InvalidRecord);
    }
    for (const EmapItem& item :
         {with(&EmapItem::device_id, 2), with(&EmapItem::server_id, 1), with(&EmapItem::type, EmapItemType::kDoor),
          with(&EmapItem::type, EmapItemType::kIoModule), with(&EmapItem::type, EmapItemType::kPos)}) {
        EXPECT_THROW(Replace(map, {good, item}), NotFound);
    }
    EXPECT_THROW(Replace(map, std::vector<EmapItem>(kMaxEmapItems + 1, good)), InvalidRecord);
    EXPECT_THAT(emaps_.Items(map), ElementsAre(good));
    for (const std::string& name : {std::string(), std::string(65, 'n'), std::string("a\0b", 3)}) {
        EXPECT_THROW(AddMap(name), InvalidRecord);
    }
    EXPECT_THROW(AddMap("Ground floor"), AlreadyExists);
    EXPECT_THROW(emaps_.Update({.id = 99, .name = "x"}), NotFound);
    EXPECT_THROW(emaps_.Remove(99), NotFound);
}

TEST_P(EmapTest, TwoEditorsCannotUndoEachOther) {
    const int map = AddMap("Ground floor");
    AddCamera();
    std::atomic<int> saved = 0;
    InParallel(4, [&](Store& store) {
        Emaps emaps(store);
        for (int i = 0; i < 20; ++i) {
            const Emap read = *emaps.Find(map);
            std::vector<EmapItem> items = emaps.Items(map);
            items.push_back({.device_id = 1});
            try {
                emaps.ReplaceItems(read, items);
                ++saved;
            } catch (const Conflict&) {
            }
        }
    });
    EXPECT_GT(saved, 20);
    EXPECT_THAT(emaps_.Items(map), SizeIs(saved.load())) << "each that was told \"saved\" is there";
}

TEST_P(EmapTest, DevicesKeepTheirPortsAndTheIdsTheyHaveElsewhere) {
    const int camera = AddCamera();
    const int server = AddServer();
    const int remote = servers_.PutCamera({.server_id = server, .id_on_server = 1, .name = "Yard"});
    EXPECT_EQ(remote, camera + 1) << "cameras of all hosts have ids of one row";
    Device module{.kind = EmapItemType::kIoModule, .name = "Box", .server_id = server, .id_on_server = 9};
    module.ports = {{0, {PortType::kInput, camera}}, {7, {PortType::kOutput, remote}}};
    module.id = devices_.Add(module);
    EXPECT_EQ(devices_.FindOnServer(EmapItemType::kIoModule, server, 9)->ports, module.ports);
    EXPECT_THROW(devices_.Add(module), AlreadyExists);
    const int own = devices_.Add({.kind = EmapItemType::kIoModule, .name = "Own"});
    EXPECT_EQ(devices_.FindOnServer(EmapItemType::kIoModule, 0, own)->name, "Own");
    EXPECT_FALSE(devices_.FindOnServer(EmapItemType::kPos, 0, own));
    module.ports.erase(0);
    module.server_id = 0;
    devices_.Update(module);
    EXPECT_EQ(devices_.Find(EmapItemType::kIoModule, module.id)->server_id, server) << "a device changes no owner";
    EXPECT_THAT(devices_.Find(EmapItemType::kIoModule, module.id)->ports, SizeIs(1));
    for (const Device& device : std::initializer_list<Device>{
             {.kind = EmapItemType::kCamera, .name = "a"},
             {.kind = EmapItemType::kDoor, .name = ""},
             {.kind = EmapItemType::kDoor, .name = "a", .ports = {{0, {}}}},
             {.kind = EmapItemType::kDoor, .name = "a", .server_id = server, .id_on_server = 1},
             {.kind = EmapItemType::kIoModule, .name = "a", .ports = {{64, {}}}}}) {
        EXPECT_THROW(devices_.Add(device), InvalidRecord) << static_cast<int>(device.kind);
    }
    for (const Device& device :
         std::initializer_list<Device>{{.kind = EmapItemType::kPos, .name = "a", .server_id = 99, .id_on_server = 1},
                                       {.kind = EmapItemType::kPos, .name = "a", .camera_id = 99}}) {
        EXPECT_THROW(devices_.Add(device), NotFound) << device.server_id;
    }
    devices_.SetCameraPorts(remote, {2, 1});
    EXPECT_EQ(devices_.CameraPorts().at(remote).inputs, 2);
    EXPECT_THROW(devices_.SetCameraPorts(99, {1, 1}), NotFound);
    EXPECT_THROW(devices_.SetCameraPorts(camera, {65, 0}), InvalidRecord);
    servers_.Remove(server);
    EXPECT_THAT(devices_.CameraPorts(), IsEmpty());
    EXPECT_THAT(devices_.List(EmapItemType::kIoModule), SizeIs(1)) << "a server takes its devices along";
    EXPECT_FALSE(servers_.FindCamera(remote));
}

TEST_P(EmapTest, AStateIsOneThatTheDeviceHasAndKnowsSinceWhen) {
    const int door = devices_.Add({.kind = EmapItemType::kDoor, .name = "Door"});
    const int box =
        devices_.Add({.kind = EmapItemType::kIoModule, .name = "Box", .ports = {{2, {PortType::kInput, 0}}}});
    devices_.Report({EmapItemType::kDoor, door, -1, "open", 100});
    devices_.Report({EmapItemType::kDoor, door, -1, "open", 200});
    devices_.Report({EmapItemType::kIoModule, box, 2, "on", 300});
    devices_.Report({EmapItemType::kIoModule, box, 2, "off", 400});
    const std::vector<DeviceState> states = devices_.States();
    ASSERT_THAT(states, SizeIs(2));
    EXPECT_EQ(states[0].since_s, 100) << "saying it again changes nothing";
    EXPECT_EQ(states[1].state + std::to_string(states[1].since_s), "off400");
    EXPECT_THROW(devices_.Report({EmapItemType::kDoor, door, -1, "on", 1}), InvalidRecord);
    EXPECT_THROW(devices_.Report({EmapItemType::kIoModule, box, 2, "open", 1}), InvalidRecord);
    EXPECT_THROW(devices_.Report({EmapItemType::kIoModule, box, 3, "on", 1}), NotFound);
    EXPECT_THROW(devices_.Report({EmapItemType::kDoor, 9, -1, "open", 1}), NotFound);
    devices_.Remove(EmapItemType::kDoor, door);
    EXPECT_THAT(devices_.States(), SizeIs(1));
}

TEST_P(EmapTest, AServersRecordNeverHoldsItsSecret) {
    const int server = AddServer();
    EXPECT_THAT(servers_.InboundPeerSecrets(), IsEmpty()) << "a server that this host connects to";
    RecordingServer connecting{.name = "Connects to this host"};
    connecting.id = servers_.Add(connecting, kSecret);
    EXPECT_THAT(servers_.InboundPeerSecrets(), ElementsAre(kSecret));
    connecting.enabled = false;
    servers_.Update(connecting);
    EXPECT_THAT(servers_.InboundPeerSecrets(), IsEmpty()) << "disabled";
    RecordingServer changed = *servers_.Find(server);
    changed.enabled = false;
    servers_.Update(changed, std::string(64, 'b'));
    EXPECT_EQ(servers_.FindSecret(server), "");
    changed.enabled = true;
    servers_.Update(changed);
    EXPECT_EQ(servers_.FindSecret(server), std::string(64, 'b')) << "kept where none is given";
    const RecordingServer good{.name = "B", .address = "nvr.example", .port = 1, .certificate = kCertificate};
    for (const std::string& secret : {std::string(), std::string(63, 'a'), std::string(64, 'g')}) {
        EXPECT_THROW(servers_.Add(good, secret), InvalidRecord) << secret;
    }
    const auto with = [&](auto member, auto value) { return With(good, member, value); };
    constexpr auto kAddress = &RecordingServer::address;
    constexpr auto kPort = &RecordingServer::port;
    constexpr auto kPem = &RecordingServer::certificate;
    for (const RecordingServer& bad :
         {with(kAddress, "a b"), with(kAddress, "a;b"), with(kAddress, "a/b"), with(kAddress, "a}b"),
          with(kAddress, "a\n"), with(kAddress, "-a"), with(kAddress, "a$b"), with(kPort, 65536), with(kPort, 0),
          with(kPem, "x"), with(kPem, "")}) {
        EXPECT_THROW(servers_.Add(bad, kSecret), InvalidRecord) << bad.address << bad.port << bad.certificate;
    }
    EXPECT_THROW(AddServer(), AlreadyExists);
    const int id = servers_.PutCamera({.server_id = server, .id_on_server = 5, .name = "Old"});
    EXPECT_EQ(servers_.PutCamera({.server_id = server, .id_on_server = 5, .name = "New"}), id);
    EXPECT_EQ(servers_.FindCamera(server, 5)->name, "New");
    EXPECT_THROW(servers_.PutCamera({.server_id = 99, .id_on_server = 5, .name = "New"}), NotFound);
}

TEST_P(EmapTest, WhatIsDeniedOfAServerOutlivesANewPairingAndNoRemovalUnseen) {
    Users users(store_);
    const int bob = users.Add("bob", "long enough", Privilege::kViewer).id;
    RecordingServer annex{.name = "Annex", .address = "192.0.2.7", .port = 8443, .certificate = kCertificate};
    const int server = servers_.Pair(annex, kSecret, {{.id_on_server = 7, .name = "Yard"}});
    const int yard = servers_.FindCamera(server, 7)->id;
    const int box =
        devices_.Add({.kind = EmapItemType::kIoModule, .name = "D", .server_id = server, .id_on_server = 1});
    devices_.Add({.kind = EmapItemType::kIoModule, .name = "Own"});
    users.Deny(bob, yard);
    users.DenyItem(bob, DeniableItem::kIoModule, box);
    users.DenyItem(bob, DeniableItem::kIoModule, box + 1);
    annex.address = "198.51.100.9";
    EXPECT_EQ(servers_.Pair(annex, std::string(64, 'b'), {{.id_on_server = 7, .name = "Back yard"}}), server);
    EXPECT_EQ(servers_.FindCamera(server, 7)->id, yard);
    EXPECT_EQ(servers_.Find(server)->address + servers_.FindSecret(server), "198.51.100.9" + std::string(64, 'b'));
    EXPECT_THROW(servers_.Pair({.name = "Annex"}, kSecret, {}), AlreadyExists) << "that one is not asked, it asks";

    const std::int64_t before = Settings(store_).Revision();
    EXPECT_EQ(servers_.PutCameras(server, {{.id_on_server = 7, .name = "Back yard"}}), 0);
    EXPECT_EQ(Settings(store_).Revision(), before) << "every minute nothing new";
    EXPECT_EQ(servers_.PutCameras(server, {{.id_on_server = 7, .name = "Yard"}, {.id_on_server = 8, .name = "Dock"}}),
              1);
    EXPECT_EQ(servers_.FindCamera(server, 7)->id, yard);
    std::vector<RemoteCamera> flood(1001, {.name = "x"});
    std::ranges::for_each(flood, [id = 1](RemoteCamera& camera) mutable { camera.id_on_server = id++; });
    EXPECT_THROW(servers_.PutCameras(server, flood), InvalidRecord);
    EXPECT_THAT(servers_.ListCameras(), SizeIs(2));

    std::string denials;
    for (const ServerDenial& denial : servers_.Denials(server)) {
        denials += denial.user + std::to_string(static_cast<int>(denial.kind)) + std::to_string(denial.id) + ' ';
    }
    EXPECT_EQ(denials, "bob0" + std::to_string(yard) + " bob3" + std::to_string(box) + " ");
    servers_.Remove(server);
    EXPECT_EQ(Ask("select count(*) from denied_cameras"), "0");
    EXPECT_THAT(users.DeniedItems(bob, DeniableItem::kIoModule), ElementsAre(box + 1));
}

LOOKHAVEN_ON_BOTH_ENGINES(EmapTest);

}  // namespace
}  // namespace lookhaven::store
