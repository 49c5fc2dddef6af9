// SPDX-License-Identifier: Apache-2.0
//
// E-maps: how each kind of item is described, their order, and which are left out.
#include <sstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "test/unit/scripted_live.h"

using namespace lookhaven::test;
using Item = __tag_EMAP_ITEM_INFO;

namespace {

// E-map 5 for user 7. The host knows cameras 1, 2 and 201, which is camera 1 of server 2.
struct Map {
    explicit Map(const Change& script) {
        for (const int id : {1, 2, 201}) {
            platform.cameras[id] = MakeCamera(id, CAM_VIDEO_H264);
            platform.cameras[id].m_AudioType = 4;
            platform.cameras[id].m_DeviceType = 6;
            platform.cameras[id].m_OwnerDevName = id == 201 ? "north" : "";
        }
        script(platform);
    }
    // The items of the answer.
    Json::Value Show() {
        LiveHandler handler(platform);
        handler.m_bPairAuth = is_paired_host;
        handler.LiveviewEmap(5);
        error = handler.m_ErrCode;
        const Calls answers = platform.CallsFrom("SetSuccess(");
        if (!answers.empty()) {
            std::istringstream(answers[0].substr(11)) >> answer;
        }
        return answer["items"];
    }

    ScriptedPlatform platform;
    bool is_paired_host = false;
    int error = 0;
    Json::Value answer;
};

Item MakeItem(int type, int id, int server = 0, int port = 0) {
    return {type, id, "n", server, 11, -12, 90, 3, 5, 6, port};
}

// type:id@server of each item.
std::string Names(const Json::Value& items) {
    std::string names;
    for (const auto& item : items) {
        names += item["type"].asString() + ":" + item["id"].asString() + "@" + item["hxId"].asString() + " ";
    }
    return names;
}

TEST(Emap, AsksInOrderAndDescribesThePicture) {
    Map map([](auto& p) {
        p.is_cms_host = true;
        p.params["privData"]["privilege"] = 3;
        p.emap_items = {MakeItem(2, 3),    MakeItem(0, 2),    MakeItem(3, 7), {},
                        MakeItem(3, 7, 2), MakeItem(0, 1, 2), MakeItem(0, 1)};
    });
    EXPECT_EQ(Names(map.Show()), "0:1@0 0:2@0 0:1@2 2:3@0 3:7@0 3:7@2 ");
    map.answer.removeMember("items");
    EXPECT_EQ(map.answer.toStyledString(),
              "{\n\t\"emap\" : \"cGlj\",\n\t\"emapLength\" : \"4\",\n\t\"emapType\" : \"png\","
              "\n\t\"hideItemName\" : true,\n\t\"itemNum\" : 6,\n\t\"smallItemSize\" : false\n}\n");
    std::string calls;
    for (const auto& call : map.platform.calls) {
        calls += call.rfind("SetSuccess", 0) == 0 ? "" : call + " ";
    }
    EXPECT_EQ(calls,
              "GetLoginUID() IsCmsHost() SlaveHxMgr(1) GetSlaveHxMap(0,0,0) Emap::Load(5) "
              "GetLoginUID() PrivProfileGetByUid(7) GetParam(privData,null) UpdateByJson({\"privilege\":3}) "
              "GetCamDetMap(1,2,201) GetCamDOMap(1,2,201) GetIOModuleSettingMap(7,207) "
              "IsDoorPrivAllowed(1,3,3) Load(2,0,0) IOModule::Load(7) IOModule::Load(207) LoadByIdOnRecServer(1,2) "
              "Load(201,0,0) Load(1,0,0) PrivProfileGetByUid(7) GetInaCamIdSet(1,1) GetInaEmapIdSet(2,0) "
              "GetInaIOIdSet(0) LoadEmapImgBase64String(floor.old.png) fflush() ");
}

struct ItemRow {
    Item item;
    bool is_cms_host;
    std::string members;  // in addition to those of every item
};

TEST(Emap, DescribesEachKind) {
    const std::string own = R"("hxCookie":"","hxIP":"","hxPort":0)";
    const std::string other = R"("hxCookie":"token","hxIP":"192.0.2.2","hxPort":"5002")";
    const std::string record = R"("AudioType":4,"VideoType":3,"deviceType":6,)";
    const ItemRow rows[] = {
        {MakeItem(0, 1, 0, 1), false, own + "," + record + R"("ownerDevName":"","portIdx":1,"portType":3)"},
        {MakeItem(0, 1, 0, 0), true, own + "," + record + R"("ownerDevName":"","portIdx":0,"portType":3)"},
        {MakeItem(0, 1, 0, 2), true, own + "," + record + R"("ownerDevName":"","portIdx":2,"portType":1)"},
        {MakeItem(0, 1, 0, 3), true, own + "," + record + R"("ownerDevName":"","portIdx":3,"portType":0)"},
        {MakeItem(0, 1, 0, -1), true, own + "," + record + R"("ownerDevName":"","portIdx":-1,"portType":0)"},
        {MakeItem(0, 2, 0, 0), true, own + "," + record + R"("ownerDevName":"","portIdx":0,"portType":0)"},
        {MakeItem(0, 1, 2, 0), true, other + "," + record + R"("ownerDevName":"north","portIdx":0,"portType":0)"},
        {MakeItem(0, 1, 2, 0), false, own + "," + record + R"("ownerDevName":"north","portIdx":0,"portType":0)"},
        {MakeItem(1, 9), true, own},
        {MakeItem(2, 9, 2), true, other},
        {MakeItem(2, 9, 3), true, own},
        {MakeItem(3, 7, 0, 0), true,
         own + R"(,"ownerDevName":"io7","pairedCamHxId":2,"pairedCamId":17,)" +
             R"("pairedCamIdOnRec":7,"portIdx":0,"portType":4)"},
        {MakeItem(3, 7, 2, 0), true,
         other + R"(,"ownerDevName":"io207","pairedCamHxId":2,"pairedCamId":217,)" +
             R"("pairedCamIdOnRec":207,"portIdx":0,"portType":0)"},
        {MakeItem(3, 7, 0, -1), true,
         own + R"(,"ownerDevName":"io7","pairedCamHxId":0,"pairedCamId":0,)" +
             R"("pairedCamIdOnRec":0,"portIdx":-1,"portType":0)"},
        {MakeItem(4, 8, 2), true, other + R"(,"pairedCamHxId":2,"pairedCamIdOnRec":209)"},
    };
    for (const auto& row : rows) {
        Map map([&](auto& p) { p.emap_items = {row.item}, p.is_cms_host = row.is_cms_host; });
        Json::Value expected;
        std::istringstream("{" + row.members + R"(,"direction":"90","iconCenterX":5,"iconCenterY":6,"id":")" +
                           std::to_string(row.item.m_Id) + R"(","hxId":")" + std::to_string(row.item.m_HxId) +
                           R"(","name":"n","textPos":"3","type":")" + std::to_string(row.item.m_Type) +
                           R"(","x":"11","y":"-12"})") >>
            expected;
        EXPECT_EQ(map.Show()[0], expected);
    }
}

struct MapRow {
    const char* name;
    std::vector<Item> items;
    Change script;
    std::string shown, log;
};

TEST(Emap, ShowsWhatIsThereAndAllowedInOrder) {
    const std::vector<Item> all = {MakeItem(4, 1), MakeItem(3, 7), MakeItem(2, 5), MakeItem(1, 6), MakeItem(0, 2)};
    const std::string shown = "0:2@0 1:6@0 2:5@0 3:7@0 4:1@0 ";
    const MapRow rows[] = {
        {"kinds", all, Nothing, shown, ""},
        {"ids, then the order on the map",
         {MakeItem(0, 2), MakeItem(4, 3), MakeItem(0, 1), MakeItem(4, 2), MakeItem(0, 2, 0, 5)},
         Nothing,
         "0:1@0 0:2@0 0:2@0 4:2@0 4:3@0 ",
         ""},
        {"the last of two links and of two doors",
         {MakeItem(1, 9), MakeItem(1, 9, 2), MakeItem(2, 9), MakeItem(2, 9, 3)},
         Nothing,
         "1:9@2 2:9@3 ",
         ""},
        {"other kinds", {MakeItem(5, 1), MakeItem(-1, 1)}, Nothing, "", ""},
        {"no items", {}, Nothing, "", ""},
        {"unknown devices", all,
         [](auto& p) {
             p.cameras.clear(), p.unknown_devices = {1, 7};
         },
         "1:6@0 2:5@0 ",
         "Failed to load POS [id:1][hxid:0]\nFailed to load iomodule [id:7][hxid:0]\n"
         "Failed to load camera [camid:2][hxid:0]\n"},
        {"unknown remote devices",
         {MakeItem(0, 9, 2), MakeItem(3, 9, 2), MakeItem(4, 9, 2)},
         [](auto& p) { p.unknown_devices = {209}; },
         "",
         "Failed to load camera [camid:9][hxid:2]\nFailed to load iomodule [id:9][hxid:2]\n"
         "Failed to load POS [id:9][hxid:2]\n"},
        {"denied", all,
         [](auto& p) { p.denied_cameras = {2}, p.denied_emaps = {6}, p.denied_doors = {5}, p.denied_modules = {7}; },
         "4:1@0 ", ""},
        {"denied module, not another server's of its number",
         {MakeItem(3, 7), MakeItem(3, 7, 2)},
         [](auto& p) { p.denied_modules = {7}; },
         "3:7@2 ",
         ""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        Map map([&](auto& p) { p.emap_items = {row.items.begin(), row.items.end()}, row.script(p); });
        EXPECT_EQ(Names(map.Show()), row.shown);
        EXPECT_TRUE(map.answer["items"].isArray());
        EXPECT_EQ(map.answer["itemNum"].asInt(), std::count(row.shown.begin(), row.shown.end(), ' '));
        std::string log;
        for (const auto& line : map.platform.logs) {
            EXPECT_EQ(line.file + " " + line.func + " " + line.categ, "liveview_src LiveviewEmap null");
            log += line.text;
        }
        EXPECT_EQ(log, row.log);
    }
}

TEST(Emap, FiltersOnlyForUsersAndOnlyWhatThereIs) {
    struct Row {
        bool is_paired_host;
        std::vector<Item> items;
        bool filtered;
    };
    for (const Row& row : {Row{false, {MakeItem(0, 1)}, true}, Row{false, {MakeItem(1, 1)}, true},
                           Row{false, {MakeItem(3, 1)}, true}, Row{false, {MakeItem(2, 1), MakeItem(4, 1)}, false},
                           Row{true, {MakeItem(0, 1), MakeItem(1, 1), MakeItem(3, 1)}, false}}) {
        Map map([&](auto& p) {
            p.emap_items = {row.items.begin(), row.items.end()};
            p.denied_cameras = p.denied_emaps = p.denied_modules = {1};
        });
        map.is_paired_host = row.is_paired_host;
        EXPECT_EQ(map.Show().empty(), row.filtered);
        EXPECT_EQ(map.platform.CallsFrom("GetInaIOIdSet").empty(), !row.filtered);
    }
}

TEST(Emap, FailsWithoutAMapOrAnExtension) {
    struct Row {
        bool has_emap;
        const char* image;
        const char* log;  // "" for success
        const char* type;
    };
    for (const Row& row : {Row{false, "floor", "Cannot load emap id = 5.\n", ""},
                           Row{true, "floor", "Not found the E-map extension name\n", ""},
                           Row{true, "", "Not found the E-map extension name\n", ""}, Row{true, "floor.", "", ""},
                           Row{true, ".svg", "", "svg"}}) {
        Map map([&](auto& p) { p.has_emap = row.has_emap, p.image_name = row.image; });
        map.Show();
        const bool failed = row.log[0] != '\0';
        EXPECT_EQ(map.error, failed ? 400 : 0);
        EXPECT_EQ(map.platform.logs.size(), failed ? 1U : 0U);
        EXPECT_EQ(failed ? map.platform.logs.at(0).text : "", row.log);
        EXPECT_EQ(map.answer["emapType"].asString(), row.type);
    }
}

}  // namespace
