// SPDX-License-Identifier: Apache-2.0
//
// Old recordings make room on a disk that is full, has no room for files, gets no space back or reports nonsense.
#include <fstream>
#include <functional>
#include <limits>

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/statvfs.h>

#include "test/component/maintenance/retention_fixture.h"

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

using testing::IsEmpty;

class FullDiskTest : public RetentionTest {};

TEST_F(FullDiskTest, TheOldestGoWhereNoFileCouldBeMade) {
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

TEST_F(FullDiskTest, NothingGoesForAFileSystemThatReportsNonsense) {
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

TEST_F(FullDiskTest, ADiskThatGetsNoSpaceBackLosesNoMoreThanWasNeeded) {
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

}  // namespace
}  // namespace lookhaven::maintenance
