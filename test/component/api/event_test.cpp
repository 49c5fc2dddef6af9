// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Event: what can be marked, listed, kept and found, by whom, and what bad input gets.
#include <fstream>
#include <set>

#include "standalone/base/clock.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/settings.h"
#include "test/component/api/event_fixture.h"

namespace lookhaven::api {

namespace {

TEST_F(EventApi, MarksAndListsWhatHappened) {
    const std::string mark = "Event&version=1&method=Mark";
    store::Users users(footage_.Records());
    store::Settings settings(footage_.Records());
    EXPECT_EQ(Ask(mark, "kind=alert&camera=1", true).status, 403) << "a viewer writes no evidence";
    users.AllowMarks(2);
    footage_.Record(1, 999'000, 1);
    footage_.Record(2, 1'999'000, 1);
    const Json::Value transaction =
        Ask(mark, "kind=pos&camera=1&start=1000000&length=20&text=1+Coffee%0A2+Tea").Json()["data"];
    EXPECT_EQ(transaction["kind"], "pos");
    EXPECT_EQ(transaction["state"], "pending");
    EXPECT_LE(transaction["start"].asInt(), 1000000);
    EXPECT_GE(transaction["stop"].asInt(), 1000020);
    const Answer lines = host_.Ask(
        "api=VEXO." + mark, admin_, {{"CONTENT_TYPE", "application/json"}},
        R"({"kind": "alert", "camera": 2, "start": "1970-01-24T04:33:20+01:00", "text": ["door", "opened"]})");
    EXPECT_EQ(lines.Json()["data"]["time"], 2'000'000);
    EXPECT_EQ(lines.Json()["data"]["text"][1], "opened");
    settings.Set("marks_per_day", "1");
    EXPECT_EQ(Ask(mark, "kind=alert&camera=1").status, 429) << "this account's share of the day";
    const Answer now = Ask(mark, "kind=alert&camera=1", true);
    EXPECT_EQ(now.Json()["data"]["reported_by"], "guest") << "now, for a moment";
    EXPECT_EQ(Ask(mark, "kind=alert&camera=1", true).status, 429);
    users.DenyMarks(2);
    viewer_ = host_.LogIn("guest").secret;
    EXPECT_EQ(Ask(mark, "kind=alert&camera=1", true).status, 403);
    const std::string list = "Event&version=1&method=List";
    const auto kinds = [&](const std::string& query, bool as_viewer) {
        std::string found;
        const Json::Value answer = Ask(list + query, "", as_viewer).Json();
        for (const Json::Value& event : answer["data"]["event"]) {
            found += event["kind"].asString() + std::to_string(event["camera_id"].asInt()) + ' ';
        }
        return found;
    };
    EXPECT_EQ(kinds("", false), "alert1 alert2 pos1 ") << "the newest first";
    EXPECT_EQ(kinds("", true), "alert1 pos1 ");
    EXPECT_EQ(kinds("&cameralists=2", true), "");
    EXPECT_EQ(kinds("&cameralists=2,x,,3", false), "alert2 ");
    EXPECT_EQ(kinds("&kind=pos", false), "pos1 ");
    EXPECT_EQ(kinds("&from=1000010&to=1000011", false), "pos1 ");
    EXPECT_EQ(kinds("&limit=1&offset=1", false), "alert2 ");
    EXPECT_EQ(kinds("&cameralists=", false), "");
}

TEST_F(EventApi, RefusesBadInput) {
    store::Users(footage_.Records()).AllowMarks(2);
    const std::int64_t now_s = base::WallSeconds();
    const std::string late = std::to_string(now_s + 600);
    const std::string early = std::to_string(now_s - 600);
    std::string many;
    for (int id = 1; id <= 1001; ++id) {
        many += std::to_string(id) + ",";
    }
    const std::string twenty = many.substr(0, many.find("21,"));
    const struct {
        std::string query;
        std::string form;  // empty: a GET
        int status;
        bool as_viewer = false;
    } cases[] = {
        {"Event&version=1&method=Mark&kind=pos&camera=1", "", 405},
        {"Event&version=1&method=Mark", "camera=1", 400},
        {"Event&version=1&method=Mark", "kind=fire&camera=1", 400},
        {"Event&version=1&method=Mark", "kind=1&camera=1", 400},
        {"Event&version=1&method=Mark", "kind=pos", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=0", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=x", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=99", 404},
        {"Event&version=1&method=Mark", "kind=pos&camera=2", 404, true},
        {"Event&version=1&method=Mark", "kind=pos&camera=3", 404, true},
        {"Event&version=1&method=Mark&privData={\"privilege\":2}", "kind=pos&camera=1", 403},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&start=0", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&start=-9223372036854775808", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&start=" + late, 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&start=" + early, 400},  // before there was footage
        {"Event&version=1&method=Mark", "kind=pos&camera=1&start=2026-03-01T08:15:30", 400},        // of which zone?
        {"Event&version=1&method=Mark", "kind=pos&camera=1&start=2026-03-01T08:15:30+01:00", 400},  // %2B is meant
        {"Event&version=1&method=Mark", "kind=pos&camera=1&length=-1", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&length=3601", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&text=a%07b", 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&text=" + std::string(8193, 'a'), 400},
        {"Event&version=1&method=Mark", "kind=pos&camera=1&text={\"a\":1}", 400},
        {"Event&version=1&method=List&from=5&to=5", "", 400},
        {"Event&version=1&method=List&from=9223372036854775807", "", 400},
        {"Event&version=1&method=List&limit=0", "", 400},
        {"Event&version=1&method=List&limit=10001", "", 400},
        {"Event&version=1&method=List&offset=-1", "", 400},
        {"Event&version=1&method=List&offset=99999999999", "", 400},
        {"Event&version=1&method=List&offset=100001", "", 400},
        {"Event&version=1&method=List&cameralists=" + many, "", 400},
        {"Event&version=1&method=List&kind=all", "", 400},
        {"Event&version=1&method=List&from=now", "", 400},
        {"Event&version=1&method=Outline&from=0&to=20", "", 400},
        {"Event&version=1&method=Outline&from=20&to=20&step=1", "", 400},
        {"Event&version=1&method=Outline&from=-1&to=20&step=1", "", 400},
        {"Event&version=1&method=Outline&from=0&to=20&step=0", "", 400},
        {"Event&version=1&method=Outline&from=0&to=9223372036854775807&step=9223372036854775807", "", 400},
        {"Event&version=1&method=Outline&from=0&to=200000&step=5", "", 400},
        {"Event&version=1&method=Outline&from=0&to=20000&step=1&cameralists=" + twenty, "", 200},
        {"Event&version=1&method=Outline&from=0&to=20000&step=1&cameralists=" + twenty + "21", "", 400},
        {"Event&version=1&method=Next&kinds=alert,fire", "", 400},
        {"Event&version=1&method=Next&time=now", "", 400},
        {"Event&version=1&method=Frame&event=99", "", 404},
        {"Picture&version=1&method=At", "", 400},
        {"Picture&version=1&method=At&camera=1", "", 400},
        {"Picture&version=1&method=At&camera=1&time_ms=5", "", 404},
        {"Picture&version=1&method=At&event=99", "", 404},
        {"Picture&version=1&method=At&event=99&width=9", "", 400},
        {"Event&version=1&method=Download", "", 404},
        {"Event&version=1&method=Download&event=99", "", 404},
        {"Event&version=1&method=Download&event=x", "", 400},
        {"Event&version=1&method=Export&from=1000000&to=1000010", "", 400},
        {"Event&version=1&method=Export&from=1000000&to=1000010&cameralists=1,2,3,4,5,6,7,8,9,10,11,12,13,14,15,16,17",
         "", 400},
        {"Event&version=1&method=Export&from=1000000&to=1086401&cameralists=1", "", 400},
        {"Event&version=1&method=Export&from=1000000&to=1000000&cameralists=1", "", 400},
        {"Event&version=1&method=Export&to=1000010&cameralists=1", "", 400},
        {"Event&version=1&method=Export&from=1000000&to=1000010&cameralists=1&utc_offset_min=1441", "", 400},
        {"Event&version=1&method=Export&from=1000000&to=1000010&cameralists=1", "", 404},
        {"Event&version=1&method=Export&from=1000000&to=1000010&cameralists=1,99", "", 404},
        {"Event&version=1&method=PlanExport&from=1000000&to=1000010&cameralists=2", "", 404, true},
        {"Event&version=1&method=Get&event=99", "", 404},
        {"Event&version=1&method=Get&event=x", "", 400},
        {"Event&version=2&method=List", "", 404},
        {"Event&version=1&method=Erase", "", 404},
        {"Catalog&version=1&method=Cameras", "", 404},
        {"Catalog&version=2&method=Groups", "", 404},
    };
    for (const auto& each : cases) {
        const Answer answer = Ask(each.query, each.form, each.as_viewer);
        EXPECT_EQ(answer.status, each.status) << each.query << ' ' << each.form.substr(0, 80) << answer.body;
    }
    store::Event small;
    small.camera_id = 3, small.mount_id = 9, small.start_s = 3'000'000, small.end_s = 3'000'001;
    store::Events(footage_.Records()).AddAll(std::vector(20'001, small));
    EXPECT_EQ(Ask("Event&version=1&method=PlanExport&from=2999990&to=3000010&cameralists=3").status, 400) << "too many";
    EXPECT_TRUE(store::Marks(footage_.Records()).Pending().empty());
    for (const char* api :
         {"Event&version=1&method=List", "Catalog&version=1&method=Groups", "Playback&version=1&method=GetPosition"}) {
        EXPECT_EQ(host_.Ask(std::string("api=VEXO.") + api, "").status, 401) << api;
    }
}

TEST_F(EventApi, KeepsFootageFromWhomItIsDenied) {
    const int event = footage_.Record(2, 1'772'366'400, 2);
    const int alert = footage_.Mark(1, 2, 1'772'366'400, 1, "door", event);
    for (const auto& [query, other_kind] : {std::pair{"&event=" + std::to_string(event), "&kind=pos"},
                                            {"&kind=alert&event=" + std::to_string(alert), "&kind=pos"}}) {
        for (const std::string method : {"Download", "Get"}) {
            const std::string asked = "Event&version=1&method=" + method + query;
            EXPECT_EQ(Ask(asked, "", true).status, 404) << "not even that it is there";
            EXPECT_EQ(Ask(asked + other_kind).status, 404);
        }
        const Json::Value told = Ask("Event&version=1&method=Get" + query).Json()["data"];
        EXPECT_EQ(told["camera_id"], 2);
        EXPECT_EQ(told[told["kind"] == "event" ? "start" : "time"], 1'772'366'400);
        EXPECT_EQ(told["frame_count"].isInt(), told["kind"] == "event");
    }
    const std::string download = "Event&version=1&method=Download&event=" + std::to_string(event);
    std::ofstream(footage_.FileOf(event)) << "";
    EXPECT_EQ(Ask(download).status, 404) << "an empty file";
    std::filesystem::remove(footage_.FileOf(event));
    EXPECT_EQ(Ask(download).status, 404) << "a file that is gone";
}

TEST_F(EventApi, WhoMayPlayButNotExportSeesPicturesAndGetsNoFile) {
    const std::string event = std::to_string(footage_.Record(1, 1'772'366'400, 2));
    const std::string alert = std::to_string(footage_.Mark(1, 1, 1'772'366'400, 1, "door", std::stoi(event)));
    store::Users(footage_.Records()).Deny(2, 1, {store::CameraAccess::kExport});
    viewer_ = host_.LogIn("guest").secret;
    const std::string span = "&from=1772366400&to=1772366402&cameralists=";
    const struct {
        std::string request, absent;  // absent: the same of what is not there; empty where the caller may
    } rows[] = {
        {"Event&version=1&method=Get&event=" + event, ""},
        {"Event&version=1&method=Frame&time_ms=0&event=" + event, ""},
        {"Picture&version=1&method=At&width=640&frame=0&event=" + event, ""},
        {"Event&version=1&method=Download&event=" + event, "Event&version=1&method=Download&event=99"},
        {"Event&version=1&method=Download&kind=alert&event=" + alert,
         "Event&version=1&method=Download&kind=alert&event=99"},
        {"Event&version=1&method=PlanExport" + span + "1", "Event&version=1&method=PlanExport" + span + "99"},
        {"Event&version=1&method=Export" + span + "1", "Event&version=1&method=Export" + span + "99"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Ask(row.request).status, 200) << row.request;
        const Answer answer = Ask(row.request, "", true);
        EXPECT_EQ(answer.status, row.absent.empty() ? 200 : 404) << row.request;
        if (!row.absent.empty()) {
            EXPECT_EQ(answer.body, Ask(row.absent, "", true).body) << "hidden is absent";
        }
    }
}

TEST_F(EventApi, KeepsWhatAManagerSaysAndTellsWhoDid) {
    const int event = footage_.Record(1, 1'772'366'400, 30);
    const int hidden = footage_.Record(2, 1'772'366'400, 30);
    const int alert = footage_.Mark(1, 1, 1'772'366'410, 5, "door", event);
    const std::string keep = "Event&version=1&method=Keep";
    const auto kept = [&](bool as_viewer) {
        std::string found;
        const Json::Value answer = Ask("Event&version=1&method=List&kept=true", "", as_viewer).Json();
        for (const Json::Value& each : answer["data"]["event"]) {
            found += std::to_string(each["id"].asInt()) + each["kept_by"].asString() + each["note"].asString() + ' ';
        }
        return found;
    };
    const std::string id = "event=" + std::to_string(event);
    EXPECT_EQ(Ask(keep, id, true).status, 403);
    EXPECT_EQ(Ask(keep, id + "&note=a%0Ab").status, 400);
    EXPECT_EQ(Ask(keep, "kind=pos&event=" + std::to_string(alert)).status, 404);
    EXPECT_EQ(kept(false), "");
    const std::string mark = "kind=alert&event=" + std::to_string(alert);
    EXPECT_EQ(Ask(keep, mark + "&note=police").Json()["data"]["event"][0]["note"], "police");
    EXPECT_EQ(Ask(keep, "event=" + std::to_string(hidden)).status, 200);
    EXPECT_EQ(Ask("Event&version=1&method=Get&" + mark, "", true).Json()["data"]["archived"], true);
    EXPECT_EQ(kept(true), std::to_string(event) + "adminpolice ");
    EXPECT_EQ(kept(false), std::to_string(hidden) + "admin " + kept(true));
    EXPECT_EQ(Ask(keep, id + "&keep=false").Json()["data"]["event"][0]["archived"], false);
    EXPECT_EQ(kept(true), "");
    std::string told;
    const Json::Value log = Ask("System&version=1&method=Audit", "limit=9").Json();
    for (const Json::Value& entry : log["data"]["entry"]) {
        told += entry["action"].asString() + ' ' + entry["object"].asString() + ' ' +
                entry["before"]["note"].asString() + '>' + entry["after"]["keeper"].asString() + ' ';
    }
    EXPECT_EQ(told, "event.release Entrance (1), event " + std::to_string(event) +
                        " police> event.keep Straße (2), event " + std::to_string(hidden) +
                        " >admin event.keep Entrance (1), event " + std::to_string(event) + " >admin ");
}

TEST_F(EventApi, WalksThroughWhatCanBePlayed) {
    const std::int64_t noon = 1'772'366'400;
    const int first = footage_.Record(1, noon, 30);
    const int hidden = footage_.Record(2, noon + 60, 10);
    const int last = footage_.Record(1, noon + 20'000'000, 10);  // months later
    const int alert = footage_.Mark(1, 1, noon + 20, 5, "door", first);
    store::Marks(footage_.Records()).Add(store::MarkKind::kPos, 1, noon + 21, 5, "has no footage yet");
    const auto at = [](std::int64_t time, int event) {
        return "&time=" + std::to_string(time) + (event == 0 ? "" : "&event=" + std::to_string(event));
    };
    const struct {
        std::string query;
        int next;
        int next_of_viewer;
    } rows[] = {
        {at(noon, first), alert, alert},
        {at(noon + 60, 0), last, last},
        {at(noon + 59, 0), hidden, last},
        {at(noon, first) + "&kinds=continuous", hidden, last},
        {at(noon, first) + "&kinds=alarm,pos", 0, 0},
        {at(noon, first) + "&kinds=continuous,alarm&cameralists=2", hidden, 0},
        {at(noon + 20'000'000, last), 0, 0},
        {at(noon + 20'000'000, last) + "&before=true", hidden, alert},
        {at(noon + 20'000'000, last) + "&before=true&kinds=alert,alarm", alert, alert},
        {at(noon, first) + "&before=true", 0, 0},
        {"&kinds=continuous&before=true", last, last},
    };
    for (const auto& row : rows) {
        for (const bool as_viewer : {false, true}) {
            const Json::Value next = Ask("Event&version=1&method=Next" + row.query, "", as_viewer).Json()["data"];
            EXPECT_EQ(next["event"].isNull() ? 0 : next["event"]["id"].asInt(),
                      as_viewer ? row.next_of_viewer : row.next)
                << row.query;
        }
    }
}

}  // namespace
}  // namespace lookhaven::api
