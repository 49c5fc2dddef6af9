// SPDX-License-Identifier: Apache-2.0
//
// The list of a span's events: the order of calls, what is told of each event, which seconds are marked.
#include <array>
#include <climits>
#include <sstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "test/support/platform/record.h"
#include "test/unit/scripted_search.h"

using namespace lookhaven::test;
using testing::ElementsAre;

namespace {

TEST(EnumEvent, AsksInOrder) {
    Search search("EnumEvent");
    search.params["mount_id"] = 3;
    search.params["reason"] = 259;
    search.Run();
    EXPECT_EQ(search.calls,
              (Calls({"GetAPIMethod()", "GetParam(mount_id,0)", "GetParam(camGrpId,0)", "GetParam(from,0)",
                      "GetParam(to,0)", "GetParam(interval,5)", "GetParam(recording,false)", "GetParam(reason,0)",
                      "GetParam(cameralists,\"\")"}) +
               kProfile + Calls{"GetInaCamIdSet(2,1)", "GetInaCamIdSet(8,1)"} + kMount +
               Calls{"String2IntList(2,,)", "EventListGetAll(3,-1,1000000,1000060,2,3,2,6,camera_id)",
                     "ReadRecLog(/cam2,1000000,60)", "FillRecLogMap(log," + std::string(60, '.') + ",5)",
                     "SetSuccess({\"camera\":[{\"camera_id\":2,\"event\":[],\"event_map\":\"map\",\"total\":0}]})"}));
}

TEST(EnumEvent, DescribesEachEvent) {
    for (const int rec_log_result : {1, -1}) {
        Search search("EnumEvent");
        Event event = MakeEvent(31, 1000001, 1000002, 7);
        event.m_FrameCount = 33, event.m_VdoType = 3, event.m_ImgW = 640, event.m_ImgH = 360, event.m_CamId = 8;
        event.m_blRecording = true, event.m_Size = 1572864, event.m_Path = "2/x.mkv";
        search.found_events = {event, event};
        Event& other = search.found_events.back();
        other.m_CamId = 2, other.m_blArchived = true, other.m_blRecording = false, other.m_Size = 1ULL << 43;
        search.muted_cameras = {4};
        search.mount_cameras[0] = MakeCamera(0, 1);
        search.mount_cameras[1] = MakeCamera(1, CAM_VIDEO_MJPEG);
        search.rec_log_result = rec_log_result;
        Params({{"recording", true}, {"cameralists", "4,1,9,0,2,2"}})(search);
        search.Run();
        Json::Value first, expected;
        std::istringstream(
            R"({"archived":false,"event_size":1.5,"fisheye_origin_view":true,"frameCount":33,"frame_count":33,"id":31,
                "id_on_RecServer":1031,"img_height":360,"img_width":640,"is_recording":true,"name":"2/x.mkv",
                "record_type":7,"start":1000001,"startTime":1000001,"stop":1000002,"stopTime":1000002,"video_type":3})") >>
            first;
        Json::Value second = first;
        second["archived"] = true;
        second["fisheye_origin_view"] = second["is_recording"] = false;
        second["event_size"] = 8388608.0;
        Calls queries;
        for (const int id : {4, 1, 2, 2}) {
            first["audio_format"] = second["audio_format"] = id == 4 ? "" : "AAC";
            Json::Value& entry = expected["camera"].append(Json::Value());
            entry["camera_id"] = id;
            entry["event"].append(first);
            entry["event"].append(second);
            entry["total"] = 2U;
            queries.push_back("EventListGetAll(0,-1,1000000,1000060," + std::to_string(id) + ",0,0," +
                              (id == 1 ? "1" : "6") + ",camera_id)");
        }
        EXPECT_EQ(search.calls.back(), "SetSuccess(" + Text(expected) + ")");
        EXPECT_EQ(search.CallsOf("EventListGetAll"), queries);
    }
}

struct CoverageRow {
    const char* name;
    int from, to;
    std::vector<std::array<int, 3>> events;  // begin, end, kind
    std::string seconds;
};

TEST(EnumEvent, MarksCoverage) {
    const CoverageRow rows[] = {
        {"inside", 100, 110, {{102, 105, 1}}, "..XXX....."},
        {"to the end", 100, 110, {{107, 200, 1}}, ".......XXX"},
        {"its whole length from the begin on", 100, 110, {{95, 102, 1}}, "XXXXXXX..."},
        {"began long before", 100, 110, {{10, 102, 1}}, "XXXXXXXXXX"},
        {"after the span", 100, 110, {{110, 120, 1}}, ".........."},
        {"ended before it began", 100, 110, {{105, 104, 1}}, ".........."},
        {"kinds that mark", 0, 6, {{0, 1, 1}, {1, 2, 2}, {2, 3, 5}, {3, 4, 6}, {4, 5, 10}, {5, 6, 257}}, "XXXXXX"},
        {"kinds that do not", 0, 4, {{0, 1, 0}, {1, 2, 7}, {2, 3, 9}, {3, 4, 11}}, "...."},
        {"nor these", 0, 4, {{0, 1, INT_MIN}, {1, 2, -1}, {2, 3, 8}, {3, 4, 266}}, "...."},
        {"from the lowest to the highest time", 100, 110, {{INT_MIN, INT_MAX, 1}}, ".........."},
        {"over the wrap of time", INT_MAX - 4, INT_MAX, {{INT_MAX - 2, INT_MIN, 1}}, "..XX"},
        {"half the time away", INT_MIN, INT_MIN + 4, {{INT_MAX, INT_MIN + 1, 1}}, "XX.."},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        Search search("EnumEvent");
        Params({{"from", row.from}, {"to", row.to}, {"interval", -3}, {"cameralists", "2,4"}})(search);
        for (const auto& [begin, end, kind] : row.events) {
            search.found_events.push_back(MakeEvent(1, begin, end, kind));
        }
        const auto fill = [](const std::string& seconds) { return "FillRecLogMap(log," + seconds + ",-3)"; };
        search.at[fill(row.seconds)] = [](auto& p) { p.found_events.clear(); };
        search.Run();
        EXPECT_THAT(search.CallsOf("FillRecLogMap"),
                    ElementsAre(fill(row.seconds), fill(std::string(row.seconds.size(), '.'))))
            << "and nothing stays for the next camera";
    }
}

}  // namespace
