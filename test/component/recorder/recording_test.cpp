// SPDX-License-Identifier: Apache-2.0
//
// What the recorder keeps of its cameras on either engine: when it is killed, around an alarm, on a full disk.
#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <map>
#include <random>
#include <thread>

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_reader.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/maintenance/camera_status.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/verify.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "test/component/recorder/recorder_fixture.h"
#include "test/support/postgres/temporary_postgres.h"

namespace lookhaven::test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

namespace fs = std::filesystem;

class RecordingTest : public RecorderTest, public testing::WithParamInterface<std::string> {
  protected:
    RecordingTest() {
        if (GetParam() == "Postgresql") {
            static TemporaryPostgres server;
            base::WriteFileAtomically(home_ / "store", server.NewDatabase(), 0600);
        }
        MakeStore();
        fs::create_directory(Folder());
        store::Mount mount;
        mount.name = "disk";
        mount.path = Folder();
        store::Store store = Store();
        Mark(store::Mounts(store).Add(mount));
    }

    void Mark(int mount) const {
        store::Store store = Store();
        maintenance::MountFolder::WriteMarker(Folder(), maintenance::MarkerFor(store, mount));
    }

    ~RecordingTest() override { ::umount2(Folder().c_str(), MNT_DETACH); }  // where there is a small disk

    fs::path Folder() const { return fs::canonical(home_) / "recordings"; }
    store::Store Store() const { return store::Store::Open(installation_->StoreUrl()); }

    void SetPlan(int camera, store::RecordMode mode) const {
        store::Store store = Store();
        store::RecordingPlan plan;
        plan.mode = mode;
        plan.pre_s = 1;
        plan.post_s = 2;
        store::RecordingPlans(store).Set(camera, plan);
    }

    std::vector<store::Event> EventsOf(int camera) const {
        store::Store store = Store();
        store::EventFilter filter;
        filter.camera_ids = {camera};
        std::vector<store::Event> events;
        store::Events(store).Visit(filter, [&](const store::Event& event) { events.push_back(event); });
        return events;
    }

    std::vector<store::Event> Open() const {
        store::Store store = Store();
        return store::Events(store).Open();
    }

    // The paths below the mount.
    std::vector<std::string> Recordings() const {
        std::vector<std::string> paths;
        for (const auto& entry : fs::recursive_directory_iterator(Folder())) {
            if (entry.path().extension() == ".mkv") {
                paths.push_back(fs::relative(entry.path(), Folder()));
            }
        }
        return paths;
    }

    // Every event, however it ended, is whole to an independent reader and to the store.
    void ExpectSound() const {
        store::Store store = Store();
        for (const maintenance::Fault& fault : maintenance::Verify(store, false).faults) {
            ADD_FAILURE() << fault.problem;
        }
        store::Events(store).VisitMount(1, [&](const store::Event& event) {
            const std::string file = Folder() / event.path;
            EXPECT_EQ(std::system(("ffmpeg -v error -xerror -i '" + file + "' -f null - </dev/null").c_str()), 0)
                << file;
        });
    }
};

TEST_P(RecordingTest, AKillCostsNoMoreThanTheLastSecond) {
    for (const char* source : {kSmallPattern, "test:h264?size=160x120&fps=25&gop=25&audio=aac"}) {
        SetPlan(AddCamera(source), store::RecordMode::kAlways);
    }
    std::mt19937 random(7);
    std::map<std::string, std::int64_t> died_ms;  // by the recording that was being written
    const int kills = GetParam() == "Sqlite" ? 30 : 16;
    for (int kill = 0; kill < kills; ++kill) {
        Child recorder = StartRecorder();
        // At any point, recovery included; every other time once it records, however long its start takes.
        const auto records = [&] {
            return std::ranges::any_of(Open(), [&](const store::Event& row) { return !died_ms.contains(row.path); });
        };
        ASSERT_TRUE(kill % 2 == 0 || Eventually(seconds(60), records)) << Log();
        std::this_thread::sleep_for(milliseconds(random() % 1600));
        recorder.Signal(SIGKILL);
        ASSERT_TRUE(recorder.Wait());
        const std::int64_t now_ms = base::WallMillis();
        for (const std::string& path : Recordings()) {
            died_ms.try_emplace(path, now_ms);
        }
    }
    EXPECT_GE(died_ms.size(), static_cast<std::size_t>(kills) / 2) << "it rarely got as far as recording";
    {
        Child recorder = StartRecorder();
        ASSERT_TRUE(Eventually([&] {
            const auto open = Open();
            return open.size() == 2 && !died_ms.contains(open.front().path);
        })) << Log();
        recorder.Signal(SIGTERM);
        ASSERT_TRUE(recorder.Wait());
    }
    ExpectSound();
    for (const auto& [path, end_ms] : died_ms) {
        if (fs::exists(Folder() / path)) {
            const archive::RecordingReader recording(Folder() / path);
            EXPECT_LE(end_ms - recording.StartWallMs() - recording.TimeOf(recording.FrameCount() - 1), 1000) << path;
        } else {
            EXPECT_LT(end_ms - archive::ParsePath(path)->start_s * 1000, 2000) << path << " lost more than a second";
        }
    }
}

TEST_P(RecordingTest, AnAlarmIsKeptWithOrWithoutARecordingAroundIt) {
    const struct {
        store::RecordMode mode;
        int known_late_s;  // after its end where it is more than two
    } rows[] = {{store::RecordMode::kAlways, 0}, {store::RecordMode::kNever, 0}, {store::RecordMode::kNever, 4}};
    for (const auto& [mode, known_late_s] : rows) {
        SCOPED_TRACE("known " + std::to_string(known_late_s) + " s late");
        const int camera = AddCamera(kSmallPattern);
        SetPlan(camera, mode);
        const Child recorder = StartRecorder();
        const std::string live = "camera " + std::to_string(camera) + " \"Camera\" stream 0: live";
        ASSERT_TRUE(Eventually([&] { return Log().find(live) != std::string::npos; })) << Log();
        if (mode == store::RecordMode::kAlways) {
            ASSERT_TRUE(Eventually([&] { return !EventsOf(camera).empty(); })) << Log();
        }
        std::this_thread::sleep_for(seconds(2 + known_late_s));  // time for a second of footage before the alarm
        store::Store store = Store();
        store::Marks marks(store);
        const int id =
            marks.Add(store::MarkKind::kAlert, camera, base::WallSeconds() - known_late_s, 1, "door open").id;
        ASSERT_TRUE(Eventually([&] {
            const auto found = marks.Find(store::MarkKind::kAlert, id);
            return found && found->state == store::MarkState::kSaved;
        })) << Log();
        // It is saved as soon as it can be played; its last half second may still be on its way to the disk.
        const fs::path span = Folder() / marks.Find(store::MarkKind::kAlert, id)->path;
        EXPECT_TRUE(Eventually([&] { return archive::RecordingReader(span).FrameCount() > 40; }))
            << "two seconds of footage at least";
        SetPlan(camera, store::RecordMode::kNever);
        // The recorder is killed then, and a file that it writes would stay open.
        ASSERT_TRUE(Eventually([&] { return Open().empty(); })) << Log();
    }
    ExpectSound();
}

// A small disk of this process and its children alone, which vanishes with them.
bool MountSmallDisk(const fs::path& folder, const char* size) {
    const uid_t user = ::geteuid();
    const gid_t group = ::getegid();
    if (::unshare(CLONE_NEWNS) != 0) {
        // A user without rights has them in a namespace; root has them here or nowhere, and needs other users too.
        if (user == 0 || ::unshare(CLONE_NEWUSER | CLONE_NEWNS) != 0) {
            return false;
        }
        std::ofstream("/proc/self/setgroups") << "deny";
        std::ofstream("/proc/self/uid_map") << user << ' ' << user << " 1";
        std::ofstream("/proc/self/gid_map") << group << ' ' << group << " 1";
    }
    return ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
           ::mount("tmpfs", folder.c_str(), "tmpfs", 0, (std::string("size=") + size).c_str()) == 0;
}

TEST_P(RecordingTest, AFullDiskPausesRecordingAloneUntilThereIsRoom) {
    if (!MountSmallDisk(Folder(), "12m")) {
        GTEST_SKIP() << "this needs the right to mount a tmpfs";
    }
    Mark(1);
    const int camera = AddCamera("test:mjpeg?size=1280x720&fps=25");
    SetPlan(camera, store::RecordMode::kAlways);
    const Child recorder = StartRecorder();
    const auto is_in = [&](maintenance::RecordingState state) {
        const auto states = maintenance::ReadCameraStatus(*installation_);
        return states.size() == 1 && states.front().state == state;
    };
    Viewer viewer(*installation_, camera);
    for (int round = 0; round < 2; ++round) {
        ASSERT_TRUE(Eventually([&] { return is_in(maintenance::RecordingState::kRecording) && !Open().empty(); }))
            << Log();
        std::this_thread::sleep_for(seconds(1));
        // Another program takes all there is.
        const base::FileDescriptor greedy = base::OpenFile(Folder() / "greedy", O_WRONLY | O_CREAT, 0600);
        for (const std::string block(4096, 'x'); ::write(greedy.Get(), block.data(), block.size()) > 0;) {
        }
        EXPECT_TRUE(Eventually([&] { return is_in(maintenance::RecordingState::kDiskFull); })) << Log();
        EXPECT_TRUE(Eventually([&] { return Open().empty(); })) << "what cannot go on is finished";
        viewer.Take(50);  // the live picture goes on
        fs::remove(Folder() / "greedy");
    }
    ASSERT_TRUE(Eventually([&] { return is_in(maintenance::RecordingState::kRecording); })) << Log();
    // The disk fills by itself now, and the old makes room for the new.
    const std::size_t before = LogLines("old events");
    EXPECT_TRUE(Eventually(seconds(60), [&] { return LogLines("old events") > before; })) << Log();
    EXPECT_TRUE(Eventually([&] { return !Open().empty(); })) << Log();
    recorder.Signal(SIGTERM);
    EXPECT_TRUE(Eventually([&] { return Open().empty(); }));
    ExpectSound();
}

INSTANTIATE_TEST_SUITE_P(Engines, RecordingTest, testing::Values("Sqlite", "Postgresql"),
                         [](const auto& engine) { return engine.param; });

}  // namespace
}  // namespace lookhaven::test
