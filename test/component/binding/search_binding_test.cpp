// SPDX-License-Identifier: Apache-2.0
//
// What the platform does for searches: events, days and lists of what the caller may see.
#include <array>
#include <fstream>

#include "platform/camera/camgroup.h"
#include "platform/privilege/privprofile.h"
#include "platform/recording/eventsearch.h"
#include "standalone/archive/recording_log.h"
#include "standalone/binding/rights.h"
#include "standalone/store/groups.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "test/component/binding/footage_fixture.h"

namespace lookhaven::binding {
namespace {

TEST_F(FootageBinding, RefusesWhatTheCallerMayNotPlayBack) {
    const int event = footage_.Record(2, kNoon, 3);
    const int alert = footage_.Mark(REC_EVENT_ALERT, 2, kNoon, 2, "door", event);
    const int transaction = footage_.Mark(REC_EVENT_POS, 2, kNoon, 2, "1 coffee", event);
    store::Users(records_).Deny(2, 2, {store::CameraAccess::kPlayback});
    const int group = store::Groups(records_).Add({0, "all", {1, 2}});
    const struct {
        const char* who;
        unsigned int caller;
        std::set<int> renounced;
        bool sees;
    } cases[] = {{"one who may", 1, {}, true},
                 {"one who may not", 2, {}, false},
                 {"nobody", 0, {}, false},
                 {"a paired host", PAIR_AUTH_UID, {}, true},
                 {"a paired host narrowed", PAIR_AUTH_UID, {2}, false},
                 {"one who renounces it", 1, {2}, false},
                 {"an account that is gone", 77, {}, false}};
    for (const auto& each : cases) {
        Call(each.caller);
        RequestContext::Current().Restrict({each.renounced, {}, {}});
        const int refused = each.sees ? 0 : -1;
        EXPECT_EQ(Event().Load(event, 0, 0, 0), refused) << each.who;
        EXPECT_EQ(AlertEvent().Load(alert, 0, 0, 0), refused) << each.who;
        EXPECT_EQ(PosEvent().Load(transaction, 0, 0, 0), refused) << each.who;
        Camera camera;
        ASSERT_EQ(camera.Load(2, 0, 0), 0) << "handlers filter the records themselves";
        EXPECT_EQ(camera.GetStoragePath().empty(), !each.sees) << each.who;
        if (each.caller == 0 || each.caller == 77) {
            continue;  // has no lists
        }
        EventFilterParam filter;
        filter.m_CamIds = {1, 2};
        std::list<Event> events;
        EXPECT_EQ(EventListGetAll(events, filter), 0);
        EXPECT_EQ(events.size(), each.sees ? 1U : 0U) << each.who;
        EXPECT_EQ(GetCamMountMap(0, "", true).contains(2), each.sees) << each.who;
        CamGroup cameras;
        EXPECT_EQ(cameras.Load(group), 0);
        EXPECT_EQ(cameras.GetCamMap().contains(2), each.sees) << each.who;
    }
    Call(1);
    for (const auto& [id, mount, server, archive] : {std::array{event, 99, 0, 0},
                                                     {event, 0, 1, 0},
                                                     {event, 0, 0, 1},
                                                     {alert, 0, 0, 0},
                                                     {0, 0, 0, 0},
                                                     {-1, 0, 0, 0}}) {
        EXPECT_NE(Event().Load(id, mount, server, archive), 0) << id << ' ' << mount << ' ' << server << ' ' << archive;
    }
    EXPECT_NE(AlertEvent().Load(transaction, 0, 0, 0), 0) << "another kind";
    EXPECT_NE(CamGroup().Load(99), 0);
    AlertEvent loaded;
    ASSERT_EQ(loaded.Load(alert, 0, 0, 0), 0);
    JpegExtractor extractor;
    ASSERT_EQ(extractor.Init(loaded.GetFullPath()), 0);
    EXPECT_EQ(Picture(extractor, 5), "picture 5") << "the footage of its span";
}

TEST_F(FootageBinding, DeniesGroups) {
    const int group = store::Groups(records_).Add({0, "yard", {3}});
    store::Users(records_).DenyGroup(2, group, {store::CameraAccess::kPlayback});
    EXPECT_EQ(PrivProfileGetByUid(2).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK), std::set<int>{group});
    EXPECT_EQ(PrivProfileGetByUid(2).GetInaPrivPerCamGrpIdSet(CAM_PRIV_AUDIO), std::set<int>{});
    EXPECT_EQ(PrivProfileGetByUid(PAIR_AUTH_UID).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK), std::set<int>{});
    EXPECT_EQ(PrivProfileGetByUid(77).GetInaPrivPerCamGrpIdSet(CAM_PRIV_PLAYBACK), std::set<int>{});
    Call(2);
    EXPECT_FALSE(GetCamMountMap(0, "", true).contains(3));
    EXPECT_EQ(GetCamLocalList(false, std::to_string(group), "", false, false).size(), 1U);
}

TEST_F(FootageBinding, KnowsTheCamerasOfAMount) {
    footage_.Record(3, kNoon, 1);
    store::Cameras(records_).Remove(3);
    const int other = store::Mounts(records_).Add({.name = "Other", .path = "/nowhere"});
    store::RecordingPlans(records_).Set(2, {.mount_id = other});
    const auto ids = [](int mount, const char* denied, bool with_deleted) {
        std::set<int> found;
        for (const auto& [id, camera] : GetCamMountMap(mount, denied, with_deleted)) {
            EXPECT_EQ(camera.m_Id, id);
            found.insert(id);
        }
        return found;
    };
    const int first = footage_.MountId();
    EXPECT_EQ(ids(0, "", true), (std::set<int>{1, 2, 3}));
    EXPECT_EQ(ids(0, "", false), (std::set<int>{1, 2}));
    EXPECT_EQ(ids(0, "1,3", true), (std::set<int>{2}));
    EXPECT_EQ(ids(first, "", true), (std::set<int>{1, 3}));
    EXPECT_EQ(ids(other, "", true), (std::set<int>{2}));
    EXPECT_EQ(ids(99, "", true), (std::set<int>{}));
    Camera camera;
    ASSERT_EQ(camera.Load(2, 0, 0), 0);
    EXPECT_EQ(camera.GetStoragePath(), "/nowhere/2");
}

TEST_F(FootageBinding, FindsEventsAndTheirSeconds) {
    const int event = footage_.Record(1, kNoon, 5);
    footage_.Record(1, kNoon + 100, 5);
    const struct {
        int mount, reason, state, offset;
        std::int64_t begin, end;
        std::size_t found;
    } cases[] = {{0, 0, 0, 0, 0, kNoon * 2, 2},
                 {0, 0, 2, 0, kNoon + 4, kNoon + 5, 1},
                 {0, 0, 0, 0, kNoon + 5, kNoon + 100, 0},
                 {99, 0, 0, 0, 0, kNoon * 2, 0},
                 {0, REC_METHOD_ALARM, 0, 0, 0, kNoon * 2, 0},
                 {0, REC_METHOD_CONTINUOUS, 0, 1, 0, kNoon * 2, 1},
                 {0, 0, 0, 0, kNoon * 2, 0, 0},
                 {0, 0, 0, -5, -2'147'483'648, 2'147'483'647, 2}};
    for (const auto& each : cases) {
        EventFilterParam filter;
        filter.m_CamIds = {1};
        filter.m_MountId = each.mount;
        filter.m_Reason = static_cast<std::uint8_t>(each.reason);
        filter.m_RecordingState = each.state;
        filter.m_Offset = each.offset;
        filter.m_BeginTm = each.begin;
        filter.m_EndTm = each.end;
        std::list<Event> events;
        EXPECT_EQ(EventListGetAll(events, filter), 0);
        EXPECT_EQ(events.size(), each.found) << &each - cases;
    }
    EventFilterParam fresh;
    std::list<Event> events;
    EXPECT_EQ(EventListGetAll(events, fresh), 0);
    EXPECT_TRUE(events.empty()) << "no camera was named";
    Event found;
    ASSERT_EQ(found.Load(event, footage_.MountId(), 0, 0), 0);
    EXPECT_EQ(found.GetStartTm(), kNoon);
    EXPECT_EQ(found.GetEndTm(), kNoon + 5);
    EXPECT_EQ(found.GetFrameCount(), 50);
    EXPECT_EQ(found.GetSize(), 1'572'864U);
    Camera camera;
    ASSERT_EQ(camera.Load(1, 0, 0), 0);
    std::string seconds(12, 'x');
    auto* bytes = reinterpret_cast<unsigned char*>(seconds.data());
    ASSERT_EQ(ReadRecLog(camera.GetStoragePath(), kNoon - 3, 12, bytes), 0);
    EXPECT_EQ(seconds, std::string("\0\0\0\1\1\1\1\1\0\0\0\0", 12));
    std::filesystem::create_directories(folder_ / "former" / "1");
    store::Mounts(records_).Add({.name = "Former", .path = (folder_ / "former").string()});
    Call(1);  // mounts are asked for once a request
    archive::WriteRecordingLog(folder_ / "former" / "1", kNoon + 4, kNoon + 7, 3);
    ASSERT_EQ(ReadRecLog(camera.GetStoragePath(), kNoon - 3, 12, bytes), 0);
    EXPECT_EQ(seconds, std::string("\0\0\0\1\1\1\1\3\3\3\0\0", 12)) << "what it recorded elsewhere before";
    for (const auto& [path, duration] : {std::pair{std::string(), 12},
                                         {std::string("/nowhere/1"), 12},
                                         {camera.GetStoragePath(), 0},
                                         {camera.GetStoragePath(), -1}}) {
        EXPECT_NE(ReadRecLog(path, kNoon, duration, bytes), 0) << path << duration;
    }
    RequestContext::Current().CloseRecords();
    std::filesystem::remove(folder_ / "lookhaven.db");
    EXPECT_THROW(EventListGetAll(events, fresh), store::StoreError) << "an empty list would say that there is nothing";
}

TEST(FillRecLogMap, GivesRunsOfSteps) {
    const struct {
        std::string recorded, covered;
        int interval;
        const char* map;
    } cases[] = {{"000111000", "000000000", 1, R"({"interval":1,"runs":[[0,3],[1,3],[0,3]]})"},
                 {"000111000", "000011000", 3, R"({"interval":3,"runs":[[0,1],[2,1],[0,1]]})"},
                 {"00000000", "00000001", 5, R"({"interval":5,"runs":[[0,1],[2,1]]})"},
                 {"1111", "0000", 100, R"({"interval":100,"runs":[[1,1]]})"},
                 {"10", "00", 0, R"({"interval":1,"runs":[[1,1],[0,1]]})"},
                 {"10", "00", -2'147'483'647 - 1, R"({"interval":1,"runs":[[1,1],[0,1]]})"},
                 {"10", "00", 2'147'483'647, R"({"interval":2147483647,"runs":[[1,1]]})"},
                 {"", "", 5, R"({"interval":5,"runs":[]})"}};
    const auto bytes = [](std::string digits) {
        for (char& digit : digits) {
            digit = digit == '0' ? '\0' : '\xff';
        }
        return digits;
    };
    for (const auto& each : cases) {
        const std::string recorded = bytes(each.recorded);
        const std::string covered = bytes(each.covered);
        Json::Value map;
        FillRecLogMap(reinterpret_cast<const unsigned char*>(recorded.data()),
                      reinterpret_cast<const unsigned char*>(covered.data()), static_cast<int>(recorded.size()),
                      each.interval, map);
        Json::StreamWriterBuilder compact;
        compact["indentation"] = "";
        EXPECT_EQ(Json::writeString(compact, map), each.map);
    }
}

TEST(String2IntList, KeepsNumbersInOrder) {
    const struct {
        std::string text, delimiter;
        std::list<int> numbers;
    } cases[] = {{"", ",", {}},
                 {",,", ",", {}},
                 {"1,,x,2", ",", {1, 2}},
                 {" 3 ,\t4", ",", {3, 4}},
                 {"5,5,-7,0", ",", {5, 5, -7, 0}},
                 {"1x,0x2,+3,1.5,99999999999,6", ",", {6}},
                 {"1--2-3", "--", {1}},
                 {"1--2--3", "--", {1, 2, 3}},
                 {"12", "", {12}},
                 {std::string("1\0,2", 4), ",", {2}}};
    for (const auto& each : cases) {
        EXPECT_EQ(String2IntList(each.text, each.delimiter), each.numbers) << each.text;
    }
    std::string many;
    for (int i = 0; i < 100'000; ++i) {
        many += "x," + std::to_string(i) + ",";
    }
    const std::list<int> kept = String2IntList(many, ",");
    EXPECT_EQ(kept.size(), 4096U);
    EXPECT_EQ(kept.back(), 4095);
}

}  // namespace
}  // namespace lookhaven::binding
