// SPDX-License-Identifier: Apache-2.0
//
// When a mount's maintenance deletes by age, recovers, and tries again after the disk has failed.
#include "standalone/recorder/mount_maintenance.h"

#include <array>
#include <atomic>
#include <optional>
#include <string>

#include <gtest/gtest.h>

#include "standalone/base/installation.h"
#include "standalone/maintenance/mount_folder.h"
#include "test/support/failing_status.h"
#include "test/support/folder.h"
#include "test/support/footage/footage.h"
#include "test/support/wait.h"

namespace lookhaven::recorder {
namespace {

namespace fs = std::filesystem;
using maintenance::MountState;

constexpr std::int64_t kSecondUs = 1'000'000;
constexpr std::int64_t kNoon = 1'772'366'400;

class MountMaintenanceTest : public testing::Test {
  protected:
    MountMaintenanceTest() { Mark(); }
    ~MountMaintenanceTest() override { test::g_unreadable = nullptr; }

    void Mark() {
        maintenance::MountFolder::WriteMarker(footage_.Mount(),
                                              maintenance::MarkerFor(footage_.Records(), footage_.MountId()));
    }

    // Starts it, and waits until what it does first is done.
    void Start() {
        maintenance_.emplace(footage_.MountId(),
                             MaintenanceContext{base::Installation(folder_).StoreUrl(),
                                                [this] { return std::optional(first_reserved_id_.load()); },
                                                [](const store::Mark&) { return false; }, space_requests_,
                                                [this] { return now_us_.load(); },
                                                [this] { return ++passes_, now_s_.load(); }},
                             false);
        Pass(0);
    }

    // Both clocks go on, the wall clock with a step; then one pass at least.
    void Pass(std::int64_t after_s, std::int64_t step_s = 0) {
        now_us_ += after_s * kSecondUs;
        now_s_ += after_s + step_s;
        for (int i = 0; i < 2; ++i) {  // a second one begins when the first has ended
            const int before = passes_;
            maintenance_->Ask();
            ASSERT_TRUE(test::Eventually(std::chrono::seconds(60), [&] { return passes_ > before; }));
        }
    }

    MountState State() { return maintenance_->Status().state; }

    void Change(const std::function<void(store::Mount&)>& change) {
        store::Mounts mounts(footage_.Records());
        store::Mount mount = mounts.Find(footage_.MountId()).value();
        change(mount);
        mounts.Update(mount);
    }

    // What a crash left: its file is missing, so that recovery removes it.
    int AddOpenRow() {
        store::Events events(footage_.Records());
        store::Event open;
        open.id = events.NextId();
        open.camera_id = 1;
        open.mount_id = footage_.MountId();
        open.start_s = open.end_s = kNoon;
        open.recording = true;
        open.path = archive::PathOf({1, kNoon, open.id, archive::FileKind::kRecording});
        archive::MakeFolderFor(footage_.Mount(), *archive::ParsePath(open.path));
        events.Begin(open);
        return open.id;
    }

    bool Has(int event) { return store::Events(footage_.Records()).Find(event).has_value(); }

    static std::string MakeStore(const fs::path& folder) {
        base::Installation::CreateFolders(folder);
        store::Store::Migrate(base::Installation(folder).StoreUrl());
        return base::Installation(folder).StoreUrl();
    }

    const test::TemporaryFolder folder_;
    test::Footage footage_{MakeStore(folder_), folder_};
    std::atomic<std::int64_t> now_us_ = 5 * kSecondUs;
    std::atomic<std::int64_t> now_s_ = kNoon + 86'400;
    std::atomic<int> passes_ = 0;
    std::atomic<int> space_requests_ = 0;
    std::atomic<int> first_reserved_id_ = 1000;
    std::optional<MountMaintenance> maintenance_;  // last: its thread uses the others
};

TEST_F(MountMaintenanceTest, DeletesByAgeOnlyOnceTheClockHasRunForAnHourWithoutAStep) {
    Change([](store::Mount& mount) { mount.max_age_s = 3 * 86'400; });
    Start();
    const struct {
        const char* what;
        std::int64_t after_s, step_s;
        bool is_deleted;
    } rows[] = {
        {"years ahead, right after the start", 20, 400 * 86'400, false},
        {"nearly an hour after it", 3590, 0, false},
        {"an hour after it", 10, 0, true},
        {"a step back", 20, -400 * 86'400, false},
        {"another ahead", 3000, 400 * 86'400, false},
        {"an hour after the one before", 600, 0, false},
        {"an hour after the last", 3000, 0, true},
        {"put right by a minute", 20, 60, true},
    };
    std::uint64_t deleted = 0;
    for (const auto& row : rows) {
        const int old = footage_.Record(1, kNoon, 60);
        Pass(row.after_s, row.step_s);
        EXPECT_EQ(!Has(old), row.is_deleted) << row.what;
        deleted += row.is_deleted ? 1 : 0;
        EXPECT_EQ(maintenance_->Counters().deleted_events, deleted) << row.what;
        if (Has(old)) {
            store::Events(footage_.Records()).Remove(std::array{old});
            fs::remove_all(footage_.Mount() / "1");
        }
    }
}

TEST_F(MountMaintenanceTest, CountsTheRetentionRunsThatFail) {
    Change([](store::Mount& mount) { mount.max_age_s = 3 * 86'400; });
    Start();
    Pass(20, 400 * 86'400);
    Pass(3600);
    const control::MountCounters before = maintenance_->Counters();
    footage_.Record(1, kNoon - 100, 60);
    const fs::path file =
        footage_.Mount() / store::Events(footage_.Records()).Find(footage_.Record(1, kNoon, 60))->path;
    fs::remove(file);
    fs::create_directories(file / "not-empty");
    Pass(20);
    EXPECT_EQ(maintenance_->Counters().retention_failures, before.retention_failures + 1);
    EXPECT_EQ(maintenance_->Counters().deleted_events, before.deleted_events + 1) << "what it deleted before it failed";
    EXPECT_GT(maintenance_->Counters().retention_runs, before.retention_runs);
    EXPECT_EQ(State(), MountState::kFailing);
}

TEST_F(MountMaintenanceTest, RecoversUntilItIsCompleteAndAgainWhatIsMountedLater) {
    const int first = AddOpenRow();
    const std::string name = fs::path(store::Events(footage_.Records()).Find(first)->path).filename();
    test::g_unreadable = name.c_str();
    Start();
    EXPECT_EQ(State(), MountState::kFailing);
    EXPECT_NE(maintenance_->Status().reason.find(name), std::string::npos) << maintenance_->Status().reason;
    const struct {
        std::int64_t after_s;
        bool is_readable, is_recovered;
        const char* what;
    } rows[] = {
        {4, true, false, "it pauses"},
        {1, false, false, "tried again in vain"},
        {9, true, false, "it pauses for longer"},
        {1, true, true, "tried again"},
    };
    for (const auto& row : rows) {
        test::g_unreadable = row.is_readable ? nullptr : name.c_str();
        Pass(row.after_s);
        EXPECT_EQ(maintenance_->IsRecovered(), row.is_recovered) << row.what;
        EXPECT_EQ(Has(first), !row.is_recovered) << row.what;
        EXPECT_EQ(State(), row.is_recovered ? MountState::kReady : MountState::kFailing) << row.what;
    }
    const int second = AddOpenRow();
    Pass(1000);
    EXPECT_TRUE(Has(second)) << "once it is complete it is over";
    fs::remove(footage_.Mount() / ".lookhaven-mount");
    Pass(1);
    EXPECT_EQ(State(), MountState::kNotMounted);
    EXPECT_FALSE(maintenance_->IsRecovered());
    EXPECT_TRUE(Has(second)) << "an unplugged disk loses no row";
    Mark();
    Pass(1);
    EXPECT_TRUE(maintenance_->IsRecovered());
    EXPECT_FALSE(Has(second));
}

TEST_F(MountMaintenanceTest, PausesForLongerAfterEachFailureInARowTenMinutesAtMost) {
    const std::string good = footage_.Mount();
    // A name that no disk knows: an error that does not mean that the folder is absent.
    const auto break_disk = [&] { Change([](store::Mount& mount) { mount.path = "/" + std::string(300, 'x'); }); };
    const auto mend_disk = [&] { Change([&](store::Mount& mount) { mount.path = good; }); };
    break_disk();
    Start();
    std::int64_t pause_s = 5;
    for (const int failures : {1, 1, 2, 5, 9}) {
        for (int i = 1; i < failures; ++i) {
            Pass(pause_s);
            pause_s = std::min<std::int64_t>(2 * pause_s, 600);
        }
        mend_disk();
        Pass(pause_s - 1);
        EXPECT_EQ(State(), MountState::kFailing) << "within " << pause_s << " s";
        Pass(1);
        EXPECT_EQ(State(), MountState::kReady) << "after " << pause_s << " s";
        break_disk();
        Pass(1);
        EXPECT_EQ(State(), MountState::kFailing);
        pause_s = 5;
    }
}

}  // namespace
}  // namespace lookhaven::recorder
