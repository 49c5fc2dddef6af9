// SPDX-License-Identifier: Apache-2.0
//
// What the platform tells the module of e-maps, of the devices on them, and of paired hosts.
#include <filesystem>

#include <gmock/gmock.h>

#include "platform/admission/host.h"
#include "platform/admission/pairauth.h"
#include "platform/admission/slavehx.h"
#include "platform/camera/camera.h"
#include "platform/emap/device.h"
#include "platform/emap/emap.h"
#include "platform/privilege/privprofile.h"
#include "standalone/binding/rights.h"
#include "standalone/emap/pictures.h"
#include "standalone/remote/pair_token.h"
#include "standalone/store/devices.h"
#include "standalone/store/servers.h"
#include "standalone/store/settings.h"
#include "test/component/binding/binding_fixture.h"

namespace lookhaven::binding {
namespace {

using store::DeniableItem;
using store::EmapItemType;
using testing::ElementsAre;
using testing::IsEmpty;

const std::string kSecret(64, 'c');
const std::string kCertificate = "-----BEGIN CERTIFICATE-----\nAA==\n-----END CERTIFICATE-----\n";

// A managing host with a server "Annex" (1), whose camera 1 is camera 2 here, and a map (1).
class EmapBinding : public Binding {
  protected:
    EmapBinding() {
        store::Users users(records_);
        users.DenyItem(2, DeniableItem::kEmap, 1);
        users.DenyItem(2, DeniableItem::kDoor, 4);
        users.DenyItem(2, DeniableItem::kIoModule, 5);
        store::Cameras(records_).Add({.name = "Gate", .ptz = true, .profiles = {{.source = "test:mjpeg"}}});
        servers_.Add({.name = "Annex", .address = "192.0.2.7", .port = 8080, .certificate = kCertificate}, kSecret);
        servers_.PutCamera(
            {.server_id = 1, .id_on_server = 1, .name = "Yard", .video_type = base::Codec::kH264, .audio = true});
        emaps_.Add({.name = "Ground floor"});
    }

    store::Emaps emaps_{records_};
    store::Devices devices_{records_};
    store::RecordingServers servers_{records_};
};

TEST_F(EmapBinding, AMapLoadsForThoseWhoMaySeeItWithItsItemsInOrder) {
    emaps_.ReplaceItems({.id = 1, .small_items = true, .revision = 1},
                        {{EmapItemType::kEmap, 1, "up", 0, 1, 2, 3, 1, 5, 6, 7}, {.device_id = 1}});
    const struct {
        unsigned int caller;
        int emap;
        bool loads;
    } rows[] = {{1, 1, true},  {2, 1, false}, {0, 1, false}, {PAIR_AUTH_UID, 1, true},
                {9, 1, false}, {1, 2, false}, {1, 0, false}, {1, -1, false}};
    for (const auto& row : rows) {
        Call(row.caller);
        Emap emap;
        EXPECT_EQ(emap.Load(row.emap) == 0, row.loads) << row.caller << " " << row.emap;
        EXPECT_EQ(emap.GetItemNum(), row.loads ? 2 : 0);
    }
    Call(PAIR_AUTH_UID);
    RequestContext::Current().Restrict({{1}, {}, {}});
    Emap narrowed;
    ASSERT_EQ(narrowed.Load(1), 0);
    EXPECT_EQ(narrowed.GetItemNum(), 1) << "without the camera that is denied";
    Call(1);
    Emap emap;
    ASSERT_EQ(emap.Load(1), 0);
    EXPECT_TRUE(emap.GetSmallItemSize() && !emap.GetHideItemName());
    __tag_EMAP_ITEM_INFO item;
    ASSERT_EQ(emap.GetItem(0, item), 0);
    EXPECT_EQ(item.m_Name, "up");
    EXPECT_THAT((std::vector{item.m_Type, item.m_Id, item.m_HxId, item.m_X, item.m_Y, item.m_Direction, item.m_TextPos,
                             item.m_IconCenterX, item.m_IconCenterY, item.m_PortIdx}),
                ElementsAre(EMAP_ITEM_EMAP, 1, 0, 1, 2, 3, 1, 5, 6, 7));
    for (const int index : {-1, 2}) {
        EXPECT_NE(emap.GetItem(index, item), 0);
        EXPECT_EQ(item.m_Name, "up") << "unchanged";
    }
}

TEST_F(EmapBinding, APictureIsItsFileInBase64OrNothing) {
    store::Emaps(records_).SetImage(1, emap::Pictures(records_, folder_).Write("<svg/>"));
    Emap emap;
    ASSERT_EQ(emap.Load(1), 0);
    int length = -1;
    EXPECT_EQ(LoadEmapImgBase64String(emap.GetImgName(), length), "PHN2Zy8+");
    EXPECT_EQ(length, 8);
    std::filesystem::create_symlink("/etc/hostname", folder_ / "emaps" / "1-0000000000000000.png");
    for (const char* name : {"", "../store", "/etc/hostname", "1-0000000000000000.png", "none.png"}) {
        length = -1;
        EXPECT_EQ(LoadEmapImgBase64String(name, length), "") << name;
        EXPECT_EQ(length, 0) << name;
    }
}

TEST_F(EmapBinding, DevicesAreFoundByTheirIdHereAndByTheirIdOnTheirServer) {
    const int own = devices_.Add({.kind = EmapItemType::kIoModule,
                                  .name = "Own box",
                                  .ports = {{0, {store::PortType::kInput, 1}}, {3, {store::PortType::kOutput, 2}}}});
    const int far = devices_.Add({.kind = EmapItemType::kIoModule, .name = "Far", .server_id = 1, .id_on_server = 77});
    IOModule module;
    EXPECT_NE(module.Load(far), 0) << "an id of this host's own, not of a device that it knows";
    ASSERT_EQ(module.LoadByIdOnRecServer(77, 1), 0);
    EXPECT_EQ(module.GetName() + std::to_string(module.GetId()), "Far" + std::to_string(far));
    EXPECT_EQ(GetIOModuleIdOnHost(1, 77), far);
    EXPECT_EQ(GetIOModuleIdOnHost(2, 77), 0);
    std::map<int, int> types;
    GetIOModuleSettingMap("1,2,9").at(own).GetType(types);
    EXPECT_EQ(types, (std::map<int, int>{{0, 3}, {3, 1}}));
    const struct {
        int port, camera, server, there;
    } rows[] = {{0, 1, 0, 1}, {3, 2, 1, 1}, {1, 0, 0, 0}, {-1, 0, 0, 0}};
    for (const auto& row : rows) {
        int camera = -1, server = -1, there = -1;
        GetPairedCam(own, row.port, camera, server, there);
        EXPECT_EQ(std::vector({camera, server, there}), std::vector({row.camera, row.server, row.there})) << row.port;
        store::Users(records_).Deny(2, row.camera == 0 ? 9 : row.camera, {store::CameraAccess::kLive});
        Call(2);
        GetPairedCam(own, row.port, camera, server, there);
        EXPECT_EQ(std::vector({camera, server, there}), std::vector({0, 0, 0})) << "one whom it is denied " << row.port;
        Call(1);
    }
    devices_.Add(
        {.kind = EmapItemType::kPos, .name = "POS terminal", .server_id = 1, .id_on_server = 5, .camera_id = 2});
    POS pos;
    ASSERT_EQ(pos.LoadByIdOnRecServer(5, 1), 0);
    EXPECT_EQ(pos.GetPairedCamIdOnRec(), 1) << "the camera's id on the terminal's server";
    Call(2);
    ASSERT_EQ(pos.LoadByIdOnRecServer(5, 1), 0);
    EXPECT_EQ(pos.GetPairedCamIdOnRec(), 0) << "nobody learns of a camera that is denied to him";
    Call(1);
    devices_.Add(
        {.kind = EmapItemType::kPos, .name = "Far terminal", .server_id = 1, .id_on_server = 6, .camera_id = 1});
    ASSERT_EQ(pos.LoadByIdOnRecServer(6, 1), 0);
    EXPECT_EQ(pos.GetPairedCamIdOnRec(), 0) << "a camera that the terminal's server does not know";
    ASSERT_EQ(pos.Load(devices_.Add({.kind = EmapItemType::kPos, .name = "Own terminal", .camera_id = 2})), 0);
    EXPECT_EQ(pos.GetPairedCamIdOnRec(), 2) << "a paired host's camera has an id of this host, too";

    EXPECT_EQ(GetCamIdOnHost(1, 1), 2);
    EXPECT_EQ(GetCamIdOnHost(1, 2), 0);
    EXPECT_EQ(GetCamOwnerHxId(2), 1);
    EXPECT_EQ(GetCamOwnerHxId(1), 0);
    Camera camera;
    EXPECT_NE(camera.LoadByIdOnRecServer(1, 2), 0);
    ASSERT_EQ(camera.LoadByIdOnRecServer(1, 1), 0);
    EXPECT_EQ(camera.m_Id * 10 + camera.m_VideoType, 23);
    EXPECT_EQ(camera.m_OwnerDevName, "Annex");
    EXPECT_EQ(std::pair(camera.m_AudioType, camera.m_DeviceType), std::pair(1, 0));
    ASSERT_EQ(camera.Load(1, 0, 0), 0);
    EXPECT_EQ(std::pair(camera.m_AudioType, camera.m_DeviceType), std::pair(0, 2));
    devices_.SetCameraPorts(2, {4, 2});
    EXPECT_EQ(GetCamDetMap("1,2").at(2).GetDICnt(), 4);
    EXPECT_EQ(GetCamDOMap("1,2").size(), 1U);
    EXPECT_THAT(GetCamDOMap("1"), IsEmpty());
}

TEST_F(EmapBinding, EachProfileIsDeniedItsOwn) {
    const PrivProfile guest = PrivProfileGetByUid(2);
    EXPECT_THAT(guest.GetInaEmapIdSet(ITEM_PRIV_VIEW, false), ElementsAre(1));
    EXPECT_THAT(guest.GetInaIOIdSet(false), ElementsAre(5));
    EXPECT_THAT(PrivProfileGetByUid(1).GetInaEmapIdSet(ITEM_PRIV_VIEW, false), IsEmpty());
    const PrivProfile nobody = PrivProfileGetByUid(9);
    EXPECT_THROW(nobody.GetInaEmapIdSet(ITEM_PRIV_VIEW, false), std::runtime_error) << "or nothing would be denied";
    EXPECT_THROW(nobody.GetInaIOIdSet(false), std::runtime_error);
    EXPECT_THROW(nobody.GetInaCamIdSet(CAM_PRIV_LIVEVIEW, true), std::runtime_error);
    const Restrictions restrictions{.cameras = {7}, .sound = {8}, .privilege = store::Privilege::kViewer};
    for (const unsigned int caller : {1U, static_cast<unsigned int>(PAIR_AUTH_UID)}) {
        Call(caller);
        EXPECT_EQ(IsManager(), caller == 1);
        RequestContext::Current().Restrict(restrictions);
        const PrivProfile restricted = PrivProfileGetByUid(caller);
        EXPECT_THAT(restricted.GetInaCamIdSet(CAM_PRIV_LIVEVIEW, true), ElementsAre(7)) << caller;
        EXPECT_THAT(restricted.GetInaCamIdSet(CAM_PRIV_AUDIO, true), ElementsAre(7, 8)) << caller;
        EXPECT_THAT(DeniedCameras(store::CameraAccess::kAudio), ElementsAre(7, 8)) << caller;
        EXPECT_EQ(restricted.GetPrivilege(), 2) << caller;
        EXPECT_FALSE(IsManager()) << caller;
    }
    const struct {
        unsigned int user;
        int door;
        bool allowed;
    } rows[] = {{1, 4, true}, {2, 4, false}, {2, 5, true}, {PAIR_AUTH_UID, 4, true}, {9, 4, false}, {0, 4, false}};
    for (const auto& row : rows) {
        EXPECT_EQ(IsDoorPrivAllowed(PrivProfileGetByUid(row.user), DOOR_PRIV_VIEW, row.door), row.allowed) << row.user;
    }
}

TEST_F(EmapBinding, AHostManagesOthersWhenItIsToldToAndProvesItselfToThem) {
    EXPECT_FALSE(IsCmsHost());
    store::Settings(records_).Set("cms", "on");
    EXPECT_TRUE(IsCmsHost());
    servers_.Add({.name = "Asks only"}, std::string(64, 'd'));
    EXPECT_THAT(SlaveHxMgr(false).GetSlaveHxMap(false, false, false), IsEmpty());
    const auto servers = SlaveHxMgr(true).GetSlaveHxMap(false, false, false);
    ASSERT_EQ(servers.size(), 1U) << "one that has no address cannot be asked";
    EXPECT_EQ(servers.at(1).GetIP() + std::to_string(servers.at(1).GetPort()), "192.0.2.78080");
    const std::string cookie = servers.at(1).GetCookie();
    const std::string timestamp = cookie.substr(0, cookie.find('-'));
    EXPECT_EQ(cookie.find(kSecret), std::string::npos);
    const std::string token = cookie.substr(timestamp.size() + 1);
    EXPECT_EQ(token, remote::MakePairToken(kSecret, timestamp));
    EXPECT_FALSE(IsAuthPairMatch(token, timestamp)) << "a token for another host is not valid here";
    for (const unsigned int caller : {2U, static_cast<unsigned int>(PAIR_AUTH_UID)}) {
        Call(caller);
        EXPECT_EQ(SlaveHxMgr(true).GetSlaveHxMap(true, true, true).at(1).GetCookie(), "") << caller;
    }
    Call(1);
    EXPECT_FALSE(IsAuthPairMatch("FailedCookie", "FailedTiemstamp"));
    EXPECT_FALSE(
        SlaveHxAuthentication().IsAuthByPairMatch(remote::MakePairToken(std::string(64, 'e'), timestamp), timestamp));
    EXPECT_EQ(RequestContext::Current().Caller(), 1U);
    EXPECT_TRUE(
        SlaveHxAuthentication().IsAuthByPairMatch(remote::MakePairToken(std::string(64, 'd'), timestamp), timestamp));
    EXPECT_EQ(RequestContext::Current().Caller(), PAIR_AUTH_UID) << "acts as the paired host";
}

}  // namespace
}  // namespace lookhaven::binding
