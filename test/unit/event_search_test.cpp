// SPDX-License-Identifier: Apache-2.0
//
// Event search: which days are marked, and what both searches have in common: rejected requests, groups, the trace.
#include <climits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "player/multiplayer/time_zone_keys.h"
#include "test/unit/scripted_search.h"

using namespace lookhaven::test;
using testing::ElementsAre;

namespace {

constexpr int kDay = 86400;

TEST(SearchAvaiDate, AsksInOrder) {
    Search search("SearchAvaiDate");
    search.params["mount_id"] = 3;
    search.Run();
    EXPECT_EQ(search.calls,
              (Calls({"GetAPIMethod()", "GetParam(mount_id,0)", "GetParam(day_count,1)", "GetParam(start,0)",
                      "GetParam(camGrpId,0)"}) +
               kProfile + Calls{"GetInaCamIdSet(2,1)"} + kMount +
               Calls{"GetParam(cameralists,\"\")", "EventListGetAll(3,0,1000000,1086400,2,99,-1,-1,camera_id)",
                     "SetSuccess({\"available_day\":[0],\"search_time\":1000000})"}));
}

struct DaysRow {
    const char* name;
    int start, day_count;
    const char* query;                       // its span
    std::vector<std::pair<int, int>> spans;  // of events
    std::string days;                        // a digit for each
};

const DaysRow kDays[] = {
    {"first and last second of a day", 0, 4, "0,345600", {{kDay, 2 * kDay - 1}}, "0100"},
    {"across midnight", 0, 4, "0,345600", {{kDay - 1, kDay}, {3 * kDay + 5, 3 * kDay + 6}}, "1101"},
    {"began before", 1000000, 3, "1000000,1259200", {{900000, 1000000 + kDay}}, "110"},
    {"ends after", 1000000, 3, "1000000,1259200", {{1000000 + 2 * kDay, 2000000}}, "001"},
    {"ended less than a day before", 1000000, 2, "1000000,1172800", {{900000, 1000000 - kDay + 1}}, "10"},
    {"ended a day before", 1000000, 2, "1000000,1172800", {{900000, 1000000 - kDay}}, "00"},
    {"begins after", 1000000, 2, "1000000,1172800", {{1000000 + 2 * kDay, 2000000}}, "00"},
    {"ends before it begins", 0, 3, "0,259200", {{2 * kDay, kDay}}, "000"},
    {"no days", 0, 0, "0,0", {{0, kDay}}, ""},
    {"fewest days", 5, INT_MIN, "5,5", {{INT_MIN, INT_MAX}}, ""},
    {"fewer than none", 5, -1, "5,-86395", {{0, INT_MAX}}, ""},
    {"most days", 0, 128, "0,11059200", {{0, INT_MAX}}, std::string(128, '1')},
    {"one too many", 0, 129, "0,11059200", {{0, INT_MAX}}, std::string(128, '1')},
    {"as many as can be", 0, INT_MAX, "0,11059200", {{0, INT_MAX}}, std::string(128, '1')},
    {"to the wrap of time", INT_MAX, 1, "2147483647,-2147397249", {{0, INT_MAX}}, "1"},
    {"over the wrap of time", INT_MAX - 10, 2, "2147483637,-2147310859", {{INT_MIN + 100, INT_MIN + 200}}, "10"},
    {"half the time apart", INT_MIN, 2, "-2147483648,-2147310848", {{INT_MAX, INT_MAX}}, "10"},
    {"all the time there is", 0, 2, "0,172800", {{INT_MIN, INT_MAX}}, "11"},
};

TEST(SearchAvaiDate, MarksUpTo128DaysAndAsksEvenForNone) {
    for (const auto& row : kDays) {
        SCOPED_TRACE(row.name);
        Search search("SearchAvaiDate");
        Params({{"start", row.start}, {"day_count", row.day_count}})(search);
        for (const auto& [begin, end] : row.spans) {
            search.found_events.push_back(MakeEvent(1, begin, end));
        }
        search.Run();
        std::string days;
        for (const char day : row.days) {
            days += std::string(days.empty() ? "" : ",") + day;
        }
        EXPECT_EQ(search.calls.back(), "SetSuccess({\"available_day\":" + (days.empty() ? "null" : "[" + days + "]") +
                                           ",\"search_time\":" + std::to_string(row.start) + "})");
        EXPECT_THAT(search.CallsOf("EventListGetAll"),
                    ElementsAre("EventListGetAll(0,0," + std::string(row.query) + ",2,99,-1,-1,camera_id)"));
    }
}

TEST(SearchAvaiDate, TakesTheListedCamerasThatThereAre) {
    struct Row {
        const char* list;
        const char* ids;  // "" for no query
    };
    const Row rows[] = {
        {"", ""},     {",,", ""}, {"2,4", "2+4"}, {"4,2,4", "2+4"},      {"1,,x,2", "2"}, {"2x, 4", "2+4"},
        {"9,12", ""}, {"5", ""},  {"-2", ""},     {"4294967298,4", "4"}, {"2", "2"},      {"99999999999999999999", ""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.list);
        Search search("SearchAvaiDate");
        search.params["cameralists"] = row.list;
        search.mount_cameras[5];  // a record without an id
        search.mount_cameras[0] = MakeCamera(0, 1);
        search.Run();
        const std::string ids = row.ids;
        EXPECT_EQ(search.CallsOf("EventListGetAll"),
                  ids.empty() ? Calls{} : Calls{"EventListGetAll(0,0,1000000,1086400," + ids + ",99,-1,-1,camera_id)"});
        EXPECT_EQ(search.calls.back(), "SetSuccess({\"available_day\":[0],\"search_time\":1000000})");
    }
}

struct RejectedRow {
    const char* name;
    Change before;
    std::string log;   // "" for none
    int code;          // 0: success
    const char* last;  // call before the answer
};

TEST(EventSearch, Rejects) {
    const std::string uid = "Failed to load priv profile of Uid[7].\n", span = "Error time duration.\n";
    const std::string forbidden = "Inaccessible camera group[6].\n", unknown = "Failed to load camera group[5].\n";
    const char *profile = "PrivProfileGetByUid", *groups = "GetInaPrivPerCamGrpIdSet", *load = "CamGroup::Load";
    const auto group = [](int id, int result) {
        return [=](ScriptedPlatform& p) { p.params["camGrpId"] = id, p.group_result = result; };
    };
    const RejectedRow both[] = {
        {"no profile, and a forbidden group", Change(group(6, 0)) + [](auto& p) { p.profile_id = 0; }, uid, 401,
         profile},
        {"negative profile", [](auto& p) { p.profile_id = -1; }, uid, 401, profile},
        {"forbidden group", group(6, 0), forbidden, 401, groups},
        {"forbidden group that is not there", group(6, 1), forbidden, 401, groups},
        {"unknown group", group(5, 1), unknown, 400, load},
        {"a group that fails", group(5, -1), unknown, 400, load},
        {"quiet", [](auto& p) { p.profile_id = 0, p.log_cfg.m_CategLevel[68] = 0; }, "", 401, profile},
    };
    const auto from_to = [](int from, int to) { return Params({{"from", from}, {"to", to}}); };
    const RejectedRow only_events[] = {
        {"no span", from_to(5, 5), span, 401, profile},
        {"negative span of nobody", Params({{"to", 5}}) + [](auto& p) { p.profile_id = 0; }, span, 401, profile},
        {"32 days", from_to(0, 32 * kDay), "", 0, "FillRecLogMap"},
        {"more than 32 days", from_to(0, 32 * kDay + 1), span, 401, profile},
        {"as long as can be", from_to(0, INT_MAX), span, 401, profile},
        {"so long that it wraps", from_to(INT_MIN, INT_MAX), span, 401, profile},
        {"the last second", from_to(INT_MAX - 1, INT_MAX), "", 0, "FillRecLogMap"},
        {"over the wrap of time", from_to(INT_MAX, INT_MIN), "", 0, "FillRecLogMap"},
        {"no camera", Params({{"cameralists", ""}}), "", 0, "String2IntList"},
        {"cameras that are not there", Params({{"cameralists", "7,8"}}), "", 0, "String2IntList"},
    };
    const auto check = [](const char* method, const RejectedRow& row) {
        SCOPED_TRACE(std::string(method) + " " + row.name);
        Search search(method);
        row.before(search);
        search.Run();
        const auto& logs = search.logs;
        ASSERT_EQ(logs.size(), row.log.empty() ? 0U : 1U);
        if (!logs.empty()) {
            EXPECT_EQ(logs[0].text, row.log);
            EXPECT_EQ(logs[0].file + " " + logs[0].func, std::string("multiplayer Handle") + method);
            EXPECT_EQ(logs[0].categ + logs[0].level, "player1");
        }
        const auto calls = search.calls;
        EXPECT_THAT(calls.at(calls.size() - 2 - logs.size()), testing::StartsWith(row.last));
        const std::string error = "SetError(" + std::to_string(row.code) + ",{\"param1\":\"\",\"param2\":\"\"})";
        EXPECT_THAT(calls.back(), testing::StartsWith(row.code == 0 ? "SetSuccess({\"camera\":[" : error));
    };
    for (const auto& row : both) {
        check("SearchAvaiDate", row);
        check("EnumEvent", row);
    }
    for (const auto& row : only_events) {
        check("EnumEvent", row);
    }
}

TEST(EventSearch, AGroupDecidesAloneWhichCamerasItHas) {
    for (const char* method : {"SearchAvaiDate", "EnumEvent"}) {
        Search search(method);
        Params({{"camGrpId", 1}, {"mount_id", 3}, {"cameralists", "12,2"}})(search);
        search.Run();
        EXPECT_EQ(search.CallsFrom("CamGroup::Load").at(1), "GetCamMap(1)");
        ASSERT_EQ(search.CallsOf("EventListGetAll").size(), 1U) << "a denied camera of the group, none outside it";
        EXPECT_THAT(search.CallsOf("EventListGetAll")[0],
                    testing::AllOf(testing::StartsWith("EventListGetAll(3,"), testing::HasSubstr(",12,")));
    }
}

TEST(EventSearch, TracesTheRequestAtLevel5) {
    for (const int level : {4, 5}) {
        Search search("Other");
        search.log_cfg.m_CategLevel[68] = level;
        search.params[""]["a"] = 1;
        search.Run();
        EXPECT_EQ(search.CallsOf("log"),
                  (level == 4 ? Calls{} : Calls{"log player/5 Method [Other], Params [{\n\t\"a\" : 1\n}\n]\n"}));
        EXPECT_EQ(search.calls.size(), level == 4 ? 1U : 3U) << "nothing else, and nothing read in vain";
    }
}

TEST(TimeZoneKeys, AscendAndAreWrittenAlike) {
    int last = -721;
    for (const std::string& key : kTimeZoneKeys) {
        const bool is_west = key.at(4) == 'n';
        const int minutes = (is_west ? -1 : 1) * std::stoi(key.substr(is_west ? 5 : 4));
        EXPECT_EQ(key, (minutes < 0 ? "utc_n" : "utc_") + std::to_string(std::abs(minutes)));
        EXPECT_GT(minutes, last);
        EXPECT_EQ(minutes % 15, 0);
        last = minutes;
    }
    EXPECT_EQ(last, 840);
}

}  // namespace
