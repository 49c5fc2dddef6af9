// SPDX-License-Identifier: Apache-2.0
//
// The command line's view of where and when cameras are recorded: mounts, plans and groups.
#include <filesystem>
#include <fstream>
#include <regex>

#include "standalone/base/file.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/settings.h"
#include "test/component/cli/recordings_fixture.h"
#include "test/support/footage/clips.h"

namespace lookhaven::cli {
namespace {

using testing::ElementsAre;

class MountsTest : public RecordingsTest {};

TEST_F(MountsTest, AMountInAStateFolderThatMovesGoesAlong) {
    for (const bool is_own : {true, false}) {
        const std::filesystem::path moved = folder_ / (is_own ? "moved" : "copied");
        std::filesystem::copy(home_, moved, std::filesystem::copy_options::recursive);
        std::filesystem::rename(home_ / "recordings", folder_ / "away");
        if (!is_own) {
            std::ofstream(moved / "recordings/.lookhaven-mount") << "lookhaven mount 1 of another\n";
        }
        const std::string home = "--home " + moved.string() + ' ';
        const std::string path = ((is_own ? moved : home_) / "recordings").string();
        Play({{home + "init", 0, "ready"}, {home + "mount list --json", 0, '"' + path + '"'}});
        std::filesystem::rename(folder_ / "away", home_ / "recordings");
        Play({{home + "init", 0, "ready"}, {home + "mount list --json", 0, '"' + path + '"'}});
    }
}

TEST_F(MountsTest, MountsAreAddedChangedAndForgotten) {
    const std::string disk = (folder_ / "disk").string();
    std::filesystem::create_directories(disk);
    std::filesystem::create_symlink(disk, folder_ / "link");
    const std::ofstream file(folder_ / "file");
    Play({{"mount add " + (folder_ / "none").string(), 66, "no folder"},
          {"mount add " + (folder_ / "file").string(), 66, "no folder"},
          {"mount add " + disk + " --shared", 65, "a shared mount needs hosts"},
          {"mount add " + disk + " --limit 1.5T --max-age 30d", 0, "Added mount disk with id"},
          {"mount add " + (folder_ / "link").string() + " --name other", 65, "belongs to mount 2"},
          {"mount add " + (folder_ / "link").string() + " --name other --take-over", 65, "inside each other"},
          {"mount add " + disk + " --limit 5X", 64, "a size looks like"},
          {"mount list", 0, "1.5 TiB  30d"},
          {"mount set 9 --name x", 66, "no mount 9"},
          {"mount remove 1", 65, "is the default"}});
    store::Store store = Open();
    store::Mounts mounts(store);
    const int id = mounts.List().back().id;
    const std::string number = std::to_string(id);
    EXPECT_EQ(base::ReadFile(disk + "/.lookhaven-mount"),
              "lookhaven mount " + number + " of " + store::Settings(store).Installation() + "\n");
    std::filesystem::create_directories(folder_ / "foreign/41/2026-03-01");
    std::ofstream(folder_ / "foreign/41/2026-03-01/081500-4711.mkv") << "x";
    std::ofstream(folder_ / "foreign/.lookhaven-mount") << "lookhaven mount " + number + " of another\n";
    const std::string foreign = (folder_ / "foreign").string();
    Play({{"mount add " + foreign, 65, "another installation"},
          {"mount set " + number + " --path " + foreign, 65, "--take-over"},
          {"mount set " + number + " --path " + (home_ / "recordings").string(), 65, "belongs to mount 1"},
          {"mount add " + foreign + " --take-over", 0, "Added mount foreign"}});
    EXPECT_GT(store::Events(store).NextId(), 4711) << "footage there keeps its numbers";
    Play({{"camera add --name New --source test:mjpeg --type mjpeg --json", 0, "\"id\" : 42"}});

    Play({{"mount set " + number + " --default --limit 0 --name Disk --disable --json", 0, "\"max_bytes\" : 0"},
          {"mount list", 0, "default disabled"},
          {"camera set 1 --mount 1 --json", 0, "\"mount_id\" : 1"},
          {"mount remove 1", 65, "cameras record"},
          {"camera set 1 --mount 0", 0, "Changed"}});
    Play({{"setting set mount_folders srv", 65, "begins with /"},
          {"setting set mount_folders /srv:", 65, "begins with /"},
          {"setting set mount_folders /srv:/mnt", 0, "/srv:/mnt"}});
    store::Events events(store);
    AddRow(events, 1, kStart, base::kReasonContinuous, false);
    Play({{"mount set 1 --limit 500", 64, "a size looks like"},
          {"mount set 1 --max-age 30", 64, "a duration looks like"},
          {"mount set 1 --max-age 30d --name Old", 65, "deletes the 1 oldest recordings"},
          {"mount list", 0, "none", "Old"},
          {"mount set 1 --max-age 30d --yes", 0, "Changed"},
          {"mount set 1 --max-age 31d", 0, "Changed"},
          {"camera set 1 --max-age 3d --name Old", 65, "deletes the 1 oldest recordings"},
          {"camera list", 0, "none", "Old"},
          {"camera set 1 --max-age 3d --yes --json", 0, "\"max_age\" : 259200"},
          {"camera set 1 --max-age 4d", 0, "Changed"},
          {"camera list", 0, "4d"},
          {"audit --limit 1 --json", 0, "\"limitDays\" : 4"},
          {"mount remove 1", 65, "--forget"},
          {"mount remove 1 --forget", 0, "files stay"},
          {"event list", 0, "no such event"}});
    EXPECT_TRUE(std::filesystem::exists(home_ / "recordings"));
}

TEST_F(MountsTest, WhatInitAdvisesAfterTheLossOfTheStoreKeepsWhatWasRecorded) {
    const std::filesystem::path mount = home_ / "recordings";
    const archive::FileName name{1, kStart, 4711, archive::FileKind::kRecording};
    archive::MakeFolderFor(mount, name);
    test::Record(test::MakeClip(test::kMjpeg), mount / archive::PathOf(name));
    for (const auto& made : std::filesystem::recursive_directory_iterator(mount)) {
        // What has only just been written may still get its row.
        std::filesystem::last_write_time(made, std::filesystem::file_time_type::clock::now() - std::chrono::hours(24));
    }
    for (const char* end : {"", "-wal", "-shm"}) {
        std::filesystem::remove(home_ / (std::string("lookhaven.db") + end));
    }
    for (const std::string& home : {std::string(), "--home " + home_.string() + " "}) {
        const Outcome refused = Run(home + "init --admin admin", "admin-s3cret\n");
        EXPECT_EQ(refused.code, 65) << refused.text;
        std::smatch advised;
        ASSERT_TRUE(std::regex_search(refused.text, advised,
                                      std::regex("or run lookhaven (.*); then run this command again, and lookhaven "
                                                 "(.*)\n")))
            << refused.text;
        EXPECT_THAT(advised.str(1), testing::StartsWith(home + "mount add "));
        if (home.empty()) {
            continue;
        }
        Play({{advised.str(1), 0, "Added mount"},
              {"init --admin admin", 0, "Added account admin", "", "admin-s3cret\n"},
              {advised.str(2), 0, "imported"},
              {"event show 4711", 0, "100 frames"},
              {"verify", 0, "1 events with 100 frames"},
              {"mount list --json", 0, "\"max_bytes\" : 0"}});
    }
}

TEST_F(MountsTest, PlansAndGroupsAreChangedAndDenied) {
    Play({{"camera set 3 --record always --segment 1m --pre 0 --post 5m --record-profile low", 0, "Changed"},
          {"camera set 3 --name Hall", 0, "Changed"},
          {"camera list --json", 0, "\"segment\" : 60"},
          {"camera set 3 --segment 5s", 65, "10 to 3600"},
          {"camera set 3 --segment 99999999999d", 64, "a duration looks like"},
          {"camera set 3 --pre 99999999s", 65, "0 to 300"},
          {"camera set 3 --mount 9", 66, "no mount 9"},
          {"camera set 3 --record sometimes", 64, "--record"},
          {"camera add --name New --source test:mjpeg --type mjpeg --record always --post 1m --json", 0,
           "\"post\" : 60"},
          {"group add Front --camera 3 --camera 4", 0, "id 2"},
          {"group add Front", 65, "already"},
          {"group add Back --camera 99", 66, "no camera 99"},
          {"group set 2 --drop 3 --add 1", 0, "cameras 1 4"},
          {"group set 9 --name x", 66, "no camera group 9"},
          {"group list --json", 0, "\"Front\""},
          {"user deny viewer --group 2 --kind playback --kind audio", 0, "group 2 is denied"},
          {"user deny viewer --group 9", 66, "no camera group 9"},
          {"user deny viewer", 64, "name one camera"},
          {"user deny viewer 1 --group 2", 64, "name one camera"},
          {"user list", 0, "playback 1 2 4  audio 2; playback 2"},
          {"user allow viewer 1 --kind audio", 0, "belongs to a group that is denied"},
          {"user allow viewer --group 2", 0, "allowed"},
          {"user list", 0, "playback 2", "playback 1"},
          {"group remove 2", 0, "cameras are kept"},
          {"group remove 2", 66, "no camera group 2"}});
    store::Store store = Open();
    const store::RecordingPlan plan = store::RecordingPlans(store).Find(3);
    EXPECT_THAT(std::vector({plan.segment_s, plan.pre_s, plan.post_s, plan.profile}), ElementsAre(60, 0, 300, 1));
}

}  // namespace
}  // namespace lookhaven::cli
