// SPDX-License-Identifier: Apache-2.0
//
// The frame of a time and its picture: VEXO.Event Frame, VEXO.Picture At.
#include <cmath>

#include "standalone/store/events.h"
#include "test/component/api/event_fixture.h"

namespace lookhaven::api {
namespace {

class PictureApi : public EventApi {};

TEST_F(PictureApi, FindsAFrameByItsTimeAndGivesItsPicture) {
    const std::int64_t noon = 1'772'366'400;
    const std::string event = "event=" + std::to_string(footage_.Record(1, noon, 30));
    const std::string alert =
        "kind=alert&event=" + std::to_string(footage_.Mark(1, 1, noon + 20, 5, "door", std::stoi(event.substr(6))));
    store::Event open = store::Events(footage_.Records()).Find(std::stoi(event.substr(6))).value();
    open.id = store::Events(footage_.Records()).NextId();
    open.recording = true;
    open.start_s += 1000;
    open.end_s += 1000;
    store::Events(footage_.Records()).Begin(open);
    const std::string growing = "event=" + std::to_string(open.id);
    const struct {
        std::string query;
        std::int64_t time_ms;  // since noon
        int frame;             // of the footage
        int picture;           // of the recording
        bool is_kept;
    } rows[] = {
        {event, 1234, 12, 12, true},      {event, -5, 0, 0, true},
        {event, 99'000, 299, 299, true},  {alert, 20'550, 5, 205, true},
        {alert, 0, 0, 200, true},         {growing, 1100, 11, 11, false},
        {"camera=1", 1299, 12, 12, true}, {"camera=1", 40'000, 299, 299, false},
    };
    for (const auto& row : rows) {
        const std::string asked = row.query + "&time_ms=" + std::to_string(noon * 1000 + row.time_ms);
        SCOPED_TRACE(asked);
        if (row.query != "camera=1") {
            const Json::Value told = Ask("Event&version=1&method=Frame&" + asked).Json()["data"];
            EXPECT_EQ(told["frame"], row.frame);
            EXPECT_EQ(told["captured_ms"].asInt64(), noon * 1000 + row.picture * 100);
            EXPECT_EQ(told["frame_count"], row.query == alert ? 50 : 300);
        }
        const Answer still = Ask("Picture&version=1&method=At&width=640&" + asked);
        EXPECT_EQ(still.body, "picture " + std::to_string(row.picture));
        EXPECT_EQ(std::llround(std::stod(still.headers.at("X-Capture-Time")) * 1000), noon * 1000 + row.picture * 100);
        EXPECT_EQ(still.headers.at("Cache-Control") == "no-store", !row.is_kept);
        if (row.is_kept) {
            EXPECT_EQ(still.headers.at("Vary"), "Cookie");
            const HostUnderTest::Headers known{{"HTTP_IF_NONE_MATCH", still.headers.at("ETag")}};
            const Answer again = host_.Ask("api=VEXO.Picture&version=1&method=At&width=640&" + asked, admin_, known);
            EXPECT_EQ(again.status, 304);
            EXPECT_EQ(again.body, "");
        }
    }
    EXPECT_EQ(Ask("Picture&version=1&method=At&width=640&frame=7&" + alert).body, "picture 207");
}

}  // namespace
}  // namespace lookhaven::api
