// SPDX-License-Identifier: Apache-2.0
//
// The command line's view of recordings: events, marks, generated events, export and verify.
#include <chrono>
#include <fstream>
#include <sstream>

#include <json/json.h>

#include "standalone/archive/layout.h"
#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/maintenance/mount_lock.h"
#include "standalone/store/events.h"
#include "standalone/store/groups.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "test/component/cli/recordings_fixture.h"
#include "test/support/footage/clips.h"

namespace lookhaven::cli {
namespace {

using testing::ElementsAre;

TEST_F(RecordingsTest, TheDemoRecordsTwoCamerasAndGroupsThemWithinASmallLimit) {
    store::Store store = Open();
    const store::Mount mount = store::Mounts(store).FindForPlan(0).value();
    EXPECT_EQ(mount.path, (home_ / "recordings").string());
    EXPECT_LE(mount.max_bytes, std::int64_t{4} << 30);
    EXPECT_EQ(std::filesystem::status(mount.path).permissions(), std::filesystem::perms(0700));
    std::string plans;
    for (const auto& [camera, plan] : store::RecordingPlans(store).List()) {
        plans += std::to_string(camera) + (plan.mode == store::RecordMode::kAlways ? "+ " : "- ");
    }
    EXPECT_EQ(plans, "1+ 2+ ");
    EXPECT_THAT(store::Groups(store).Find(1).value().camera_ids, ElementsAre(1, 2));

    const std::string zip = (folder_ / "out.zip").string();
    Play({{"demo footage", 0, "8 events of the last days with 8 alerts"},
          {"demo footage", 0, "0 events"},
          {"verify", 0, "8 events with 4000 frames"},
          {"export 1 2 --from -4d " + zip, 0, "gaps without footage"},
          {"export verify " + zip, 0, "files are unchanged.\nSigned by this host, whose key is "},
          {"export verify " + zip + " --key 12", 64, "64 hexadecimal digits"},
          {"export key", 0, "-----BEGIN PUBLIC KEY-----"},
          {"export 1 2 --from -4d " + zip, 73, "already a file"},
          {"export 1 2 --from -4d " + zip + ".mkv", 64, "ends in .zip"},
          {"export 1 x --from -4d " + zip + ".mkv", 64, "not a camera's id"},
          {"export 9 --from -4d " + zip + ".mkv", 66, "nothing of these cameras"},
          {"export 1 --from -4d --to -5d " + zip + ".mkv", 64, "--to must be after"},
          {"export --from -4d " + zip, 64, "export needs cameras"},
          {"export verify " + (home_ / "lookhaven.db").string(), 65, "not an export"},
          {"export verify " + zip + ".mkv", 66, "there is no file"},
          {"event list --kind pos --camera 2", 0, "2 x Coffee", "pending"},
          {"event list --text 'COFFEE total'", 0, "2 x [Coffee]", "door"},
          {"event list --text coffee --kind alert", 0, "no such event"},
          {"event list --text '\"*\"'", 65, "1 to 16 words"}});

    std::string bytes = base::ReadFile(zip);
    bytes[bytes.size() / 2] ^= 1;
    std::ofstream(zip, std::ios::binary) << bytes;
    test::Shell("python3 -c \"import sys, zipfile; zipfile.ZipFile(sys.argv[1], 'a').writestr('\\x1b]0;x', '')\" " +
                zip);
    Play({{"export verify " + zip, 1, "was changed\n\\x1b]0;x was added", "\x1b"},
          {"export 1 --from -1d - >" + zip + ".mkv", 0, ""}});
    EXPECT_THAT(test::Probe(zip + ".mkv"), testing::StartsWith("mjpeg,"));

    // A second set-up takes nothing back, and lowers no limit under which there may be recordings.
    Play({{"mount set 1 --limit 900G", 0, "Changed"},
          {"camera set 1 --record never", 0, "Changed"},
          {"group set 1 --name Hof --drop 2", 0, "the cameras 1."},
          {"init", 0, "ready"},
          {"demo setup", 0, "0 demo cameras"}});
    EXPECT_EQ(store::Mounts(store).List().size(), 1U);
    EXPECT_EQ(store::Mounts(store).Find(1)->max_bytes, std::int64_t{900} << 30);
    EXPECT_EQ(store::RecordingPlans(store).Find(1).mode, store::RecordMode::kNever);

    // What the owner made his own stays.
    store::Events events(store);
    const int growing = AddRow(events, 1, kStart, base::kReasonContinuous, true);
    Play({{"camera set 3 --name Shed", 0, "Changed"}, {"demo remove", 69, "1 of their recordings"}});
    events.Finish(growing, kStart + 300, 1, 1);
    Play({{"demo remove", 0, "Removed 3 demo cameras, 2 e-maps and 9 recordings.\nThe account viewer is kept"},
          {"camera list", 0, "Shed", "Gate"},
          {"group list", 0, "Hof"},
          {"door list", 0, "", "door"},
          {"event list", 0, "no such event"},
          {"verify --repair", 0, "0 events with 0 frames"},
          {"demo remove", 0, "Removed 0 demo cameras"}});
    for (const auto& entry : std::filesystem::recursive_directory_iterator(home_ / "recordings")) {
        EXPECT_NE(entry.path().extension(), ".mkv") << entry.path();
    }
}

TEST_F(RecordingsTest, EventsAreListedByWhatWasAskedFor) {
    store::Store store = Open();
    store::Events events(store);
    const int first = AddRow(events, 1, kStart, base::kReasonContinuous, false);
    const int second = AddRow(events, 2, kStart + 300, base::kReasonAlarm, false);
    const int third = AddRow(events, 7, kStart + 600, base::kReasonContinuous, true);  // a camera that was removed
    const std::map<std::string, std::vector<int>> rows = {
        {"", {third, second, first}},
        {"--limit 1", {third}},
        {"--camera 1 --camera 7", {third, first}},
        {"--group 1", {second, first}},
        {"--mount 1 --finished", {second, first}},
        {"--mount 2", {}},
        {"--reason alarm", {second}},
        {"--from 2026-03-01T08:20:00Z", {third, second}},
        {"--from '2026-03-01 08:19:59Z' --to " + std::to_string(kStart + 301), {second, first}},
        {"--to 2026-03-01T08:15Z", {}},
        {"--from -1d", {}},
        {"--kind alert", {}},
    };
    for (const auto& [options, expected] : rows) {
        Json::Value answer;
        const Outcome outcome = Run("event list --json " + options);
        EXPECT_EQ(outcome.code, 0) << options << outcome.text;
        std::istringstream(outcome.text) >> answer;
        std::vector<int> ids;
        for (const Json::Value& entry : answer) {
            ids.push_back(entry["id"].asInt());
        }
        EXPECT_EQ(ids, expected) << options << outcome.text;
    }
    Play({{"event list", 0, "5m", "demo"},
          {"event list --kind pos", 0, "no such event"},
          {"event list --group 9", 66, "no camera group 9"},
          {"event list --from yesterday", 64, "a time looks like"},
          {"event list --from 2026-02-30", 64, "a time looks like"},
          {"event list --from 1969-12-31T00:00Z", 64, "a time looks like"},
          {"event list --limit -1", 64, "--limit"},
          {"event list --reason smell", 64, "--reason"},
          {"event show 3", 0, "still recording"},
          {"event show 1", 0, "cannot be read"},
          {"event show 99", 66, "no event 99"},
          {"event keep 2 --note 'police 12/7'", 0, "is kept"},
          {"event show 2", 0, ": police 12/7"},
          {"event list --kept", 0, "kept", "demo"},
          {"event keep 2 --note \"$(printf 'a\\tb')\"", 65, "a note is"},
          {"event release 2 --json", 0, "\"archived\" : false"},
          {"event list --kept", 0, "no such event"},
          {"event keep 99", 66, "no event 99"},
          {"event export 1 " + (folder_ / "out.mkv").string(), 66, ""}});
    EXPECT_FALSE(std::filesystem::exists(folder_ / "out.mkv")) << "what failed leaves nothing behind";
}

TEST_F(RecordingsTest, WhatIsRemovedIsFoundNoMoreAndDeletedByTheRecorder) {
    store::Store store = Open();
    store::Events events(store);
    AddRow(events, 1, kStart, base::kReasonContinuous, false);
    AddRow(events, 1, kStart + 300, base::kReasonContinuous, false);
    AddRow(events, 2, kStart, base::kReasonContinuous, true);
    store::Marks marks(store);
    const int missed = marks.Add(store::MarkKind::kPos, 2, kStart + 9000, 0, "Mrs Miller").id;
    const int inside = marks.Add(store::MarkKind::kAlert, 1, kStart + 100, 0, "").id;
    marks.Miss(missed);
    Play({{"event keep 2", 0, "kept"},
          {"event remove 2", 65, "is kept: release it first"},
          {"event remove 3", 65, "still being recorded"},
          {"event remove 99", 66, "no event 99"},
          {"event remove " + std::to_string(inside) + " --footage", 65, "not complete yet"}});
    const Outcome some = Run("event remove 99 " + std::to_string(missed) + " 2");
    EXPECT_EQ(some.code, 66) << some.text;
    EXPECT_THAT(some.text, testing::ContainsRegex("was removed.*no event 99.*; event 2 is kept")) << "each for itself";
    Play({{"event list --text miller", 0, "no such event"},
          {"event show " + std::to_string(missed), 66, "there is no event"}});
    EXPECT_TRUE(events.Find(1)) << "what is refused removes nothing";
    marks.Miss(inside);
    Play({{"event remove " + std::to_string(inside) + " --footage --json", 0, "\"recordings\" : 1"},
          {"event list --camera 1 --json", 0, "\"id\" : 2", "\"id\" : 1,"},
          {"audit", 0, "event.remove", "Miller"}});
    const std::vector<store::Event> pending = events.PendingDeletion(1);
    ASSERT_EQ(pending.size(), 1U);
    EXPECT_EQ(pending.front().id, 1);
}

TEST_F(RecordingsTest, MarksArePutDownForTheRecorder) {
    Play({{"event mark 1 --at 2026-03-01T08:15:00Z --text 'at the door' --json", 0, "\"pending\""},
          {"event mark 2 --kind pos --at 2026-03-01T08:15:00Z --length 1m --text '2 x Coffee' --text Total", 0, "id 2"},
          {"event mark 1", 0, "footage"},
          {"event mark 99", 66, "no camera 99"},
          {"event mark 1 --length 2h", 65, "0 to 3600"},
          {"event mark 1 --length 1y", 64, "a duration looks like"},
          {"event mark 1 --kind recorded", 64, "--kind"},
          {"event list --kind alert --to 2026-03-02", 0, "at the door", "Coffee"},
          {"event show 2", 0, "2 x Coffee\nTotal"},
          {"event export 2 -", 69, "not complete yet"}});
    store::Store store = Open();
    const store::Mark transaction = store::Marks(store).Find(store::MarkKind::kPos, 2).value();
    EXPECT_EQ(transaction.start_s, kStart - 5);
    EXPECT_EQ(transaction.end_s, kStart + 60 + 10);
    store::Marks(store).Miss(2);
    Play({{"event export 2 -", 66, "no footage"}});
}

TEST_F(RecordingsTest, GeneratedEventsFillASpanAndAreRemovedTogether) {
    store::Store store = Open();
    store::Events events(store);
    const int kept = AddRow(events, 1, kStart, base::kReasonContinuous, false);
    Play({{"demo events", 64, "--count"},
          {"demo events --count 0", 64, "--count"},
          {"demo events --count 1000000 --days 1", 64, "do not fit"},
          {"demo events --count 1000 --days 10 --json", 0, "\"marks_added\" : 20"},
          {"mount list", 0, "1       0 B"},
          {"event export 500 -", 66, "no footage"}});
    const std::vector<store::Event> all = events.List({.camera_ids = {1, 2, 3, 4}});
    ASSERT_EQ(all.size(), 1001U);
    const std::int64_t last = all.back().start_s;
    EXPECT_EQ(all.front().id, kept);
    EXPECT_NEAR(static_cast<double>(last - all[1].start_s), 10 * 86400.0, 2 * 3600.0);
    std::map<int, std::int64_t> ends;
    for (const store::Event& event : all) {
        EXPECT_GE(event.start_s, ends[event.camera_id]) << "events of one camera do not overlap";
        ends[event.camera_id] = event.end_s;
    }
    Play({{"demo events --remove", 0, "1020"}, {"demo events --remove", 0, "Removed 0 "}});
    EXPECT_TRUE(events.Find(kept));
}

TEST_F(RecordingsTest, ARecordingIsTakenInExportedAndMissedWhenItIsGone) {
    store::Store store = Open();
    const int id = store::Events(store).NextId();
    const std::string path = archive::PathOf({1, kStart, id, archive::FileKind::kRecording});
    test::Record(test::MakeClip(test::kH264, "-c:a aac -ar 16000"), home_ / "recordings" / path);
    for (const auto& made : std::filesystem::recursive_directory_iterator(home_ / "recordings")) {
        // What has only just been written may still get its row.
        std::filesystem::last_write_time(made, std::filesystem::file_time_type::clock::now() - std::chrono::hours(24));
    }
    const std::string number = std::to_string(id);
    const auto whole = folder_ / "whole.mkv";
    const auto silent = folder_ / "silent.mkv";
    store::Mount broken;
    broken.name = "broken";
    broken.path = "/" + std::string(300, 'x');  // an error that does not mean that the mount is away
    broken.id = store::Mounts(store).Add(broken);
    Play({{"verify", 1, "verify --repair"},
          {"event show " + number, 66, "no event"},
          {"verify --repair", 1, "imported"},
          {"verify --repair", 1, "was left alone: "}});
    store::Mounts(store).Remove(broken.id, true);
    {
        maintenance::MountLock other;
        EXPECT_TRUE(other.Hold(home_ / "recordings"));
        Play({{"verify", 0, "1 events"}, {"verify --repair", 65, "another state folder"}});
    }
    Play({{"verify --json", 0, "\"frames\" : 100"},
          {"event show " + number, 0, "H.264 160x120, 100 frames", "cannot be read"},
          {"event export " + number + " " + whole.string(), 0, "was exported"},
          {"event export " + number + " " + whole.string(), 73, "already a file"},
          {"event export " + number + " --no-sound " + silent.string(), 0, "was exported"},
          {"event export " + number + " /no/such/x.mkv", 66, "/no/such/x.mkv"}});
    EXPECT_THAT(test::Probe(whole), testing::MatchesRegex("h264,100\naac,6[0-9]\n"));
    EXPECT_EQ(test::Probe(silent), "h264,100\n");
    std::filesystem::resize_file(home_ / "recordings" / path, 100);
    Play({{"event export " + number + " " + (folder_ / "x").string(), 65, ""}});
    std::filesystem::remove(home_ / "recordings" / path);
    Play({{"event show " + number, 0, "cannot be read"},
          {"event export " + number + " " + (folder_ / "x").string(), 66, ""},
          {"verify --json", 1, "\"problem\""},
          {"verify --repair", 0, "done:"},
          {"verify", 0, "0 events", "done:"},
          {"event show " + number, 66, "no event"}});
    EXPECT_FALSE(std::filesystem::exists(folder_ / "x")) << "what failed leaves nothing behind";
}

}  // namespace
}  // namespace lookhaven::cli
