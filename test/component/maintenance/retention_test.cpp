// SPDX-License-Identifier: Apache-2.0
//
// Old recordings make room: what goes, and all that must not go with it.
#include "standalone/maintenance/retention.h"

#include <algorithm>
#include <array>
#include <fstream>
#include <functional>
#include <limits>

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"
#include "standalone/base/installation.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/verify.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/marks.h"
#include "test/support/folder.h"
#include "test/support/footage/footage.h"

namespace {

std::function<void(struct statvfs&)> g_lie;

}  // namespace

// In the place of the C library's: a file system that does not know what it holds.
extern "C" int fstatvfs(int file, struct statvfs* report) {
    // By the name that it has where files have sizes of 64 bits, which is an alias on machines of 64.
    static const auto real = reinterpret_cast<int (*)(int, struct statvfs*)>(::dlsym(RTLD_NEXT, "fstatvfs64"));
    const int result = real(file, report);
    if (g_lie) {
        g_lie(*report);
    }
    return result;
}

namespace lookhaven::maintenance {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t kNoon = 1772366400;
constexpr std::int64_t kEventBytes = 1'572'864;
constexpr std::int64_t kNow = kNoon + 86400;

class RetentionTest : public testing::Test {
  protected:
    RetentionTest() { MountFolder::WriteMarker(footage_.Mount(), MarkerFor(footage_.Records(), footage_.MountId())); }

    DeletionResult Run(std::int64_t max_bytes, std::int64_t max_age_s = 0, AgeLimit age_limit = AgeLimit::kApplies) {
        store::Mount mount = *store::Mounts(footage_.Records()).Find(footage_.MountId());
        mount.max_bytes = max_bytes;
        mount.max_age_s = max_age_s;
        return EnforceRetention(footage_.Records(), mount, {kNow, age_limit, now_us_}, watch_);
    }

    std::vector<int> Left() {
        std::vector<int> ids;
        store::Events(footage_.Records())
            .Visit({.camera_ids = {1, 2, 3}, .end_s = kNow},
                   [&](const store::Event& event) { ids.push_back(event.id); });
        std::sort(ids.begin(), ids.end());
        return ids;
    }

    static std::string MakeStore(const fs::path& folder) {
        base::Installation::CreateFolders(folder);
        store::Store::Migrate(base::Installation(folder).StoreUrl());
        return base::Installation(folder).StoreUrl();
    }

    const test::TemporaryFolder folder_;
    test::Footage footage_{MakeStore(folder_), folder_};
    std::int64_t now_us_ = 0;
    DiskWatch watch_;
};

TEST_F(RetentionTest, TheOldestGoWithTheirFilesUntilTheLimitIsKept) {
    const int first = footage_.Record(2, kNoon, 60);
    const int second = footage_.Record(1, kNoon + 100, 60);
    const int third = footage_.Record(1, kNoon + 160, 60);
    const std::vector<fs::path> gone = {footage_.FileOf(first), footage_.FileOf(second)};
    EXPECT_EQ(Run(3 * kEventBytes).events, 0) << "as much as is allowed";
    const DeletionResult removed = Run(kEventBytes);
    EXPECT_EQ(removed.events, 2);
    EXPECT_EQ(removed.bytes, 2 * kEventBytes);
    EXPECT_THAT(Left(), ElementsAre(third));
    for (const fs::path& file : gone) {
        EXPECT_FALSE(fs::exists(file) || fs::exists(archive::IndexPathOf(file)));
    }
    EXPECT_TRUE(fs::exists(footage_.FileOf(third)));
    EXPECT_FALSE(fs::exists(footage_.Mount() / "2")) << "a camera without recordings leaves no folder";
    std::vector<unsigned char> log(120);
    ASSERT_TRUE(archive::ReadRecordingLog(footage_.Mount() / "1", kNoon + 100, log));
    EXPECT_EQ(std::count(log.begin(), log.begin() + 60, 0), 60) << "what is gone is not said to be there";
    EXPECT_EQ(std::count(log.begin() + 60, log.end(), 0), 0);
}

TEST_F(RetentionTest, TheOldestGoWhereNoFileCouldBeMade) {
    const char* const mount = footage_.Mount().c_str();
    if (::unshare(CLONE_NEWNS) != 0 || ::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
        ::mount("tmpfs", mount, "tmpfs", 0, "size=1g,nr_inodes=500") != 0) {
        GTEST_SKIP() << "only root can make a file system of few files";
    }
    const MountMarker mark = MarkerFor(footage_.Records(), footage_.MountId());
    MountFolder::WriteMarker(footage_.Mount(), mark);
    footage_.Record(1, kNoon, 60);
    const int second = footage_.Record(1, kNoon + 60, 60);
    const auto space = [&] { return MountFolder::Open(footage_.Mount(), mark)->Space(); };
    EXPECT_EQ(Run(0).events, 0);
    while (space().free_files > 3 * space().ReserveFiles() - 2) {
        std::ofstream(footage_.Mount() / ("x" + std::to_string(space().free_files)));
    }
    EXPECT_EQ(Run(0).events, 0) << "between the limits";
    while (space().free_files > 0) {
        std::ofstream(footage_.Mount() / ("x" + std::to_string(space().free_files)));
    }
    EXPECT_EQ(Run(0).events, 2) << "as many as there are";
    EXPECT_THAT(Left(), IsEmpty()) << second;
    ::umount2(mount, MNT_DETACH);
}

TEST_F(RetentionTest, NothingGoesForAFileSystemThatReportsNonsense) {
    footage_.Record(1, kNoon, 60);
    constexpr auto kUnknown = std::numeric_limits<fsfilcnt_t>::max();
    const std::function<void(struct statvfs&)> lies[] = {
        [](auto& report) { report.f_files = 1000, report.f_favail = 0; },
        [](auto& report) { report.f_files = report.f_favail = 0; },
        [](auto& report) { report.f_files = report.f_favail = kUnknown; },
        [](auto& report) { report.f_blocks = report.f_bavail = 0; },
        [](auto& report) { report.f_blocks = report.f_bavail = kUnknown; },
    };
    for (const auto& lie : lies) {
        g_lie = lie;
        EXPECT_EQ(Run(0).events, 0) << &lie - lies;
    }
    g_lie = [](auto& report) { report.f_bavail = 0; };
    EXPECT_EQ(Run(0).events, 1) << "full";
    g_lie = {};
}

TEST_F(RetentionTest, ADiskThatGetsNoSpaceBackLosesNoMoreThanWasNeeded) {
    int recorded = 0;
    const auto record = [&](int count) {
        for (; count > 0; --count) {
            footage_.Record(1, kNoon + 60 * recorded++, 60);
        }
    };
    // 100 MiB; twice the reserve is 4 MiB, and 6 MiB are to be free.
    std::int64_t free_bytes = 3 << 20;
    g_lie = [&](auto& report) {
        report.f_blocks = (100 << 20) / report.f_frsize;
        report.f_bavail = static_cast<fsblkcnt_t>(free_bytes) / report.f_frsize;
    };
    const struct {
        int at_s, freed, recorded, deleted;
        bool is_held;
        const char* what;
    } rows[] = {
        {0, 0, 20, 2, false, "what is needed"},
        {50, 0, 0, 0, false, "it may yet come"},
        {55, 0, 2, 2, false, "it came, and was recorded to"},
        {100, 2, 0, 0, false, "it comes late"},
        {110, -2, 0, 2, false, "in vain"},
        {171, 0, 0, 1, true, "one, to see"},
        {290, 0, 0, 0, true, "not every minute"},
        {292, 0, 0, 1, true, "another"},
        {10'000, 0, 0, 1, true, ""},
        {20'000, 0, 0, 1, true, ""},
        {30'000, 0, 0, 1, true, ""},
        {40'000, 0, 0, 1, true, ""},
        {43'599, 0, 0, 0, true, "every hour"},
        {43'601, 0, 0, 1, true, ""},
        {43'611, 8, 0, 0, false, "the snapshot is removed"},
        {43'621, -8, 0, 2, false, "full again"},
    };
    for (const auto& row : rows) {
        now_us_ = std::int64_t{1'000'000} * row.at_s;
        free_bytes += row.freed * kEventBytes;
        record(row.recorded);
        EXPECT_EQ(Run(0).events, row.deleted) << row.at_s << " s: " << row.what;
        EXPECT_EQ(watch_.IsHeld(), row.is_held) << row.at_s << " s: " << row.what;
    }
    watch_ = {SpaceWatch(true), SpaceWatch(true)};
    EXPECT_EQ(Run(0).events, 1) << "after a restart";
    EXPECT_EQ(Run(static_cast<int>(Left().size() - 1) * kEventBytes).events, 1) << "for the mount's own limit";
    g_lie = {};
}

TEST_F(RetentionTest, AgeCountsFromAnEventsEnd) {
    const int old = footage_.Record(1, kNow - 161, 60);
    const int young = footage_.Record(1, kNow - 159, 60);
    EXPECT_EQ(Run(0, 101).events, 1);
    EXPECT_THAT(Left(), ElementsAre(young));
    EXPECT_EQ(Run(0, 0).events, 0) << "no limit at all";
    EXPECT_FALSE(store::Events(footage_.Records()).Find(old));
}

TEST_F(RetentionTest, AWrongDateNeitherDeletesNorKeeps) {
    const int future = footage_.Record(1, kNow + 400 * 86400, 60);
    const int old = footage_.Record(1, kNow - 500, 60);
    const int young = footage_.Record(1, kNow - 60, 60);
    const int past = footage_.Record(1, 1000, 60);  // the clock began at 1970
    EXPECT_EQ(Run(0, 100, AgeLimit::kWaits).events, 0);
    EXPECT_EQ(Run(0, 100).events, 2) << future << " is older than " << old;
    EXPECT_THAT(Left(), ElementsAre(young, past));
    EXPECT_EQ(Run(kEventBytes).events, 1);
    EXPECT_THAT(Left(), ElementsAre(past)) << "recorded last";
}

TEST_F(RetentionTest, WhatIsKeptOnPurposeOrUnknownStays) {
    const int kept = footage_.Record(1, kNoon, 60);
    const int growing = footage_.Record(1, kNoon + 100, 60);
    const int plain = footage_.Record(1, kNoon + 200, 60);
    store::Events events(footage_.Records());
    store::KeptEvents(footage_.Records()).Keep(std::array{kept}, {"for the police", "admin", kNoon});
    store::Event open = *events.Find(growing);
    open.recording = true;
    events.Remove(std::array{growing});
    events.Begin(open);
    const fs::path stranger = footage_.FileOf(plain).parent_path() / "holiday.mkv";
    std::ofstream(stranger) << "mine";
    for (const std::int64_t max_age_s : {0, 1}) {
        Run(1, max_age_s);
        EXPECT_THAT(Left(), ElementsAre(kept, growing));
    }
    EXPECT_TRUE(fs::exists(stranger));
    EXPECT_TRUE(fs::exists(footage_.FileOf(kept)) && fs::exists(footage_.FileOf(growing)));
}

TEST_F(RetentionTest, ADiskThatIsNotThereLosesNoRow) {
    const int event = footage_.Record(1, kNoon, 60);
    for (const auto& hide : std::initializer_list<std::function<void()>>{
             [&] { fs::remove(footage_.Mount() / ".lookhaven-mount"); },
             [&] {
                 MountFolder::WriteMarker(footage_.Mount(), {footage_.MountId(), "somebody else's"});
             },
             [&] { fs::rename(footage_.Mount(), folder_ / "unplugged"); },
         }) {
        hide();
        EXPECT_EQ(Run(1, 1).events, 0);
        EXPECT_THAT(Left(), ElementsAre(event));
    }
}

TEST_F(RetentionTest, AnEventWhoseFileCannotBeRemovedKeepsItsRow) {
    const int stuck = footage_.Record(1, kNoon, 60);
    const int next = footage_.Record(1, kNoon + 60, 60);
    const fs::path file = footage_.FileOf(stuck);
    fs::remove(file);
    fs::create_directory(file);
    EXPECT_THROW(Run(1), std::system_error);
    EXPECT_THAT(Left(), ElementsAre(stuck, next));
    EXPECT_EQ(footage_.FileOf(stuck), file);
    fs::remove(file);
    EXPECT_EQ(Run(1).events, 2);
}

TEST_F(RetentionTest, ADeletionThatACrashInterruptedIsFinished) {
    const int first = footage_.Record(1, kNoon, 60);
    const int second = footage_.Record(1, kNoon + 60, 60);
    const fs::path file = footage_.FileOf(second);
    fs::remove(footage_.FileOf(first));
    store::Events events(footage_.Records());
    events.BeginDeletion(std::array{first, second});
    EXPECT_THAT(Verify(footage_.Records(), false).faults, IsEmpty());
    EXPECT_EQ(Run(0).events, 2);
    EXPECT_FALSE(fs::exists(file) || !events.PendingDeletion(footage_.MountId()).empty());
}

// Root may pass every permission: takes that away until destruction.
class OrdinaryUser {
  public:
    OrdinaryUser() { EXPECT_TRUE(::geteuid() != 0 || ::seteuid(65534) == 0); }
    ~OrdinaryUser() { EXPECT_EQ(::seteuid(::getuid()), 0); }
};

TEST_F(RetentionTest, AFolderThatCannotBeOpenedIsNotAnAbsentOne) {
    const int event = footage_.Record(1, kNoon, 60);
    const fs::path camera = footage_.Mount() / "1";
    for (const fs::path& folder : {fs::path(folder_), footage_.Mount()}) {
        fs::permissions(folder, fs::perms(0755));
    }
    fs::permissions(camera, fs::perms::none);
    {
        const OrdinaryUser user;
        EXPECT_THROW(Run(0, 1), std::system_error);
    }
    fs::permissions(camera, fs::perms(0755));
    EXPECT_THAT(Left(), ElementsAre(event));
    EXPECT_TRUE(fs::exists(footage_.FileOf(event)));
    EXPECT_EQ(Run(0, 1).events, 1);
}

TEST_F(RetentionTest, AnAlarmGoesWithTheLastOfItsFootage) {
    const int first = footage_.Record(1, kNoon, 60);
    footage_.Record(1, kNoon + 60, 60);
    const int mark = footage_.Mark(1, 1, kNoon + 50, 30, "Door", first);
    store::Marks marks(footage_.Records());
    EXPECT_EQ(Run(kEventBytes).marks, 0);
    EXPECT_TRUE(marks.Find(store::MarkKind::kAlert, mark)) << "half of it can be shown";
    EXPECT_EQ(Run(1).marks, 1);
    EXPECT_FALSE(marks.Find(store::MarkKind::kAlert, mark));
    EXPECT_THAT(Left(), IsEmpty());
    EXPECT_FALSE(fs::exists(footage_.Mount() / "1"));
}

TEST_F(RetentionTest, MarksThatKeptFootageKeepsHideNoOther) {
    const int kept = footage_.Record(1, kNoon, 60);
    const int plain = footage_.Record(1, kNoon + 60, 60);
    store::KeptEvents(footage_.Records()).Keep(std::array{kept}, {});
    for (int i = 0; i < 120; ++i) {
        footage_.Mark(1, 1, kNoon + 10, 5, "kept", kept);
    }
    footage_.Mark(1, 1, kNoon + 80, 5, "gone", plain);
    EXPECT_EQ(Run(1).marks, 1);
}

TEST_F(RetentionTest, APathThatLeadsAwayRemovesNothing) {
    const int event = footage_.Record(1, kNoon, 60);
    std::ofstream(folder_ / "precious") << "x";
    fs::create_directory_symlink(folder_, footage_.Mount() / "2");
    store::Events events(footage_.Records());
    for (const char* path : {"../precious", "/etc/passwd", "2/precious", ""}) {
        store::Event hostile = *events.Find(event);
        hostile.id = events.NextId();
        hostile.path = path;
        events.AddAll(std::array{hostile});
    }
    Run(1);
    EXPECT_THAT(Left(), IsEmpty());
    EXPECT_TRUE(fs::exists(folder_ / "precious"));
}

}  // namespace
}  // namespace lookhaven::maintenance
