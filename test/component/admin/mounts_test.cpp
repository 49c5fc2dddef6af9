// SPDX-License-Identifier: Apache-2.0
//
// Where an account may add a mount, for how long a mount lasts, and what the rates and days are made of.
#include "standalone/admin/mounts.h"

#include <ctime>
#include <fstream>

#include <sys/stat.h>
#include <unistd.h>

#include "standalone/admin/change.h"
#include "standalone/admin/mount_claim.h"
#include "standalone/admin/mount_forecast.h"
#include "standalone/admin/mount_place.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/events.h"
#include "standalone/store/settings.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

namespace fs = std::filesystem;
using store::Engine;
using store::EngineName;
using testing::ElementsAre;

constexpr std::int64_t kDay = 86'400;

TEST(MountForecast, IsTheLeastOfLimitsAndRoom) {
    const struct {
        const char* mount;
        MountFigures figures;
        double days;  // below 0: none
    } rows[] = {
        {"nothing recorded", {.used_bytes = 50, .free_bytes = 100}, -1},
        {"the disk alone", {.used_bytes = 50, .free_bytes = 100, .bytes_per_day = 10}, 15},
        {"its reserve", {.used_bytes = 50, .free_bytes = 100, .reserve_bytes = 10, .bytes_per_day = 10}, 13},
        {"a full disk", {.used_bytes = 5, .free_bytes = 1, .reserve_bytes = 10, .bytes_per_day = 10}, 0},
        {"a size limit", {.used_bytes = 50, .free_bytes = 100, .max_bytes = 80, .bytes_per_day = 10}, 8},
        {"a limit that the disk has no room for",
         {.used_bytes = 50, .free_bytes = 100, .max_bytes = 900, .bytes_per_day = 10},
         15},
        {"an age limit", {.free_bytes = 100, .max_age_s = 3 * kDay, .bytes_per_day = 10}, 3},
        {"an age that is never reached", {.free_bytes = 100, .max_age_s = 30 * kDay, .bytes_per_day = 10}, 10},
        {"an age limit and nothing recorded", {.free_bytes = 100, .max_age_s = kDay / 2}, 0.5},
        {"a disk that is not mounted", {.used_bytes = 50, .is_there = false, .bytes_per_day = 10}, -1},
        {"its limit", {.is_there = false, .max_bytes = 80, .bytes_per_day = 10}, 8},
    };
    for (const auto& row : rows) {
        EXPECT_DOUBLE_EQ(DaysUntilDeleted(row.figures).value_or(-1), row.days) << row.mount;
    }
    EXPECT_DOUBLE_EQ(BytesPerDay(700, 1000, 7 * kDay, 1000 + 7 * kDay), 100);
    EXPECT_DOUBLE_EQ(BytesPerDay(700, 1000, 7 * kDay, 1000 + kDay), 700) << "recorded since yesterday";
    EXPECT_DOUBLE_EQ(BytesPerDay(700, 1000, 7 * kDay, 1000), 24 * 700) << "since this moment";
}

class MountTest : public store::StoreTest {
  protected:
    std::string MakeFolder(const char* name, mode_t mode = 0755) {
        fs::create_directories(folder_ / name);
        ::chmod((folder_ / name).c_str(), mode);
        return folder_ / name;
    }
    store::Mount AddMount(const std::string& path) { return admin::AddMount(store_, {}, {.path = path}); }

    fs::path home_ = MakeFolder("disks/home", 0700);
    base::Installation installation_{home_};
};

TEST_P(MountTest, AnAccountMayAddOnlyWhatNobodyElseUsesOrCouldExchange) {
    const std::string disks = MakeFolder("disks");
    AddMount(MakeFolder("disks/first"));
    const store::Mount removed = AddMount(MakeFolder("disks/gone"));
    MakeFolder("disks/gone/7");
    RemoveMount(store_, {}, removed.id, {}, false);
    MakeFolder("disks/empty/lost+found");
    MakeFolder("disks/open/inside");
    MakeFolder("disks/open", 0777);
    MakeFolder("disks/sticky", 01777);
    std::ofstream(MakeFolder("disks/full") + "/index.html") << "x";
    MakeFolder("disks/home/recordings");
    MakeFolder("elsewhere");
    fs::create_symlink(folder_ / "elsewhere", folder_ / "disks/link");
    fs::create_symlink(folder_ / "disks", folder_ / "way");
    store::Settings(store_).Set(store::kMountFoldersSetting, "/none:" + disks + ":" + (folder_ / "way").string());
    const struct {
        std::string path;
        const char* refusal;  // empty: it may
    } rows[] = {
        {"", "below"},
        {"disks/empty", "below"},
        {"/etc", "below"},
        {"/proc/self/cwd", "below"},
        {disks, "below"},
        {disks + "/../elsewhere", "below"},
        {disks + "/./empty", "below"},
        {disks + "/empty/", "below"},
        {disks + "x/empty", "below"},
        {folder_ / "elsewhere", "below"},
        {disks + "/none", "does not exist"},
        {disks + "/link", "symbolic link"},
        {(folder_ / "way").string() + "/empty", "symbolic link"},
        {disks + "/full/index.html", "not a folder"},
        {disks + "/full", "not empty"},
        {disks + "/first", "not empty"},  // with another mount's marker
        {disks + "/home", "state folder"},
        {disks + "/home/recordings", "state folder"},
        {disks + "/open/inside", "others"},
        {disks + "/open", "can write to it"},
        {disks + "/sticky", "can write to it"},
        {disks + "/empty", ""},
        {disks + "/gone", ""},
    };
    for (const auto& row : rows) {
        std::string refusal;
        try {
            RequireMountPlace(store_, installation_, row.path);
        } catch (const store::InvalidRecord& error) {
            refusal = error.what();
        }
        if (*row.refusal == '\0') {
            EXPECT_EQ(refusal, "") << row.path;
        } else {
            EXPECT_THAT(refusal, testing::HasSubstr(row.refusal)) << row.path;
        }
    }
}

TEST_P(MountTest, WhatALowerLimitDeletesIsToldBeforeItIsSaved) {
    const store::Mount mount = AddMount(MakeFolder("disks/first"));
    const std::int64_t now_s = ::time(nullptr);
    store::Events events(store_);
    for (int day = 0; day < 4; ++day) {
        store::Event event;
        event.id = events.NextId();
        event.camera_id = 1;
        event.mount_id = mount.id;
        event.start_s = now_s - (4 - day) * kDay;
        event.end_s = event.start_s + 60;
        event.size_bytes = 100;
        event.path = "1/x";
        events.Begin(event);
    }
    const auto set = [&](MountChange change) { SetMount(store_, {}, mount.id, {}, change); };
    try {
        set({.name = "Disk", .max_age_s = 3 * kDay});
        ADD_FAILURE() << "the first day goes";
    } catch (const DeletesRecordings& refusal) {
        EXPECT_EQ(refusal.Loss().events, 1);
        EXPECT_EQ(refusal.Loss().end_s, now_s - 4 * kDay + 60);
    }
    EXPECT_EQ(store::Mounts(store_).Find(mount.id)->name, "first");
    set({.max_bytes = 400});
    set({.max_age_s = 3 * kDay, .confirmed = true});
    set({.max_age_s = 4 * kDay});
    EXPECT_THROW(SetMount(store_, {}, mount.id, MountRecord(mount)["revision"].asInt64(), {.name = "x"}), Stale);
    EXPECT_THROW(RemoveMount(store_, {}, mount.id, {}, false), StillNeeded);

    const std::int64_t today_s = now_s / kDay * kDay;
    EXPECT_THAT(events.BytesByDay(mount.id, today_s - 5 * kDay, 6), ElementsAre(0, 100, 100, 100, 100, 0));
    EXPECT_THAT(events.BytesByDay(mount.id + 1, today_s, 2), ElementsAre(0, 0));
    EXPECT_EQ(events.OldestOn(mount.id), now_s - 4 * kDay);
    const std::vector<store::RecentFootage> recent = events.RecordedSince(now_s - 2 * kDay);
    ASSERT_EQ(recent.size(), 1U);
    EXPECT_EQ(recent[0].size_bytes, 200);
    EXPECT_EQ(recent[0].first_s, now_s - 2 * kDay);
    RemoveMount(store_, {}, mount.id, {}, true);
    EXPECT_FALSE(store::Mounts(store_).Find(mount.id));
}

LOOKHAVEN_ON_BOTH_ENGINES(MountTest);

}  // namespace
}  // namespace lookhaven::admin
