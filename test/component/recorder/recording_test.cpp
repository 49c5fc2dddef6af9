// SPDX-License-Identifier: Apache-2.0
//
// What the recorder keeps of its cameras: through its own sudden death, and around an alarm.
#include <csignal>
#include <cstdlib>
#include <map>
#include <random>
#include <thread>

#include "standalone/archive/recording.h"
#include "standalone/base/clock.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "standalone/upkeep/verify.h"
#include "test/component/recorder/recorder_fixture.h"

namespace lookhaven::test {

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class RecordingTest : public RecorderTest {
  protected:
    RecordingTest() {
        MakeStore();
        std::filesystem::create_directory(Folder());
        store::Mount mount;
        mount.name = "disk";
        mount.path = Folder();
        store::Store store = Store();
        store::Mounts(store).Add(mount);
    }

    std::filesystem::path Folder() const { return std::filesystem::canonical(home_) / "recordings"; }
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

    // Every event, however it ended, is whole to an independent reader and to the store.
    void ExpectSound() const {
        store::Store store = Store();
        for (const upkeep::Fault& fault : upkeep::Verify(store, false).faults) {
            ADD_FAILURE() << fault.problem;
        }
        store::Events(store).VisitMount(1, [&](const store::Event& event) {
            const std::string file = Folder() / event.path;
            EXPECT_EQ(std::system(("ffmpeg -v error -xerror -i '" + file + "' -f null - </dev/null").c_str()), 0)
                << file;
        });
    }
};

TEST_F(RecordingTest, SuddenDeathCostsNoMoreThanTheLastSecond) {
    const int cameras[] = {AddCamera("test:mjpeg?size=160x120&fps=25"),
                           AddCamera("test:h264?size=160x120&fps=25&gop=25&audio=aac")};
    ChangeCamera(cameras[1], [](store::Camera& camera) { camera.video_type = store::VideoType::kH264; });
    for (const int camera : cameras) {
        SetPlan(camera, store::RecordMode::kAlways);
    }
    std::mt19937 random(7);
    std::map<int, std::int64_t> died_ms;  // by the event that was open
    for (int round = 0; round < 20; ++round) {
        Child recorder = StartRecorder();
        std::vector<store::Event> open;
        ASSERT_TRUE(Eventually([&] {
            store::Store store = Store();
            open = store::Events(store).Open();
            return open.size() == 2 && !died_ms.contains(open[0].id) && !died_ms.contains(open[1].id) &&
                   open[0].frame_count > 0 && open[1].frame_count > 0;
        })) << Log();
        std::this_thread::sleep_for(milliseconds(random() % 1500));  // dies anywhere in what it does
        recorder.Signal(SIGKILL);
        const std::int64_t now_ms = base::WallMillis();
        ASSERT_TRUE(recorder.Wait());
        for (const store::Event& event : open) {
            died_ms[event.id] = now_ms;
        }
    }
    Child recorder = StartRecorder();
    ASSERT_TRUE(Eventually([&] {
        store::Store store = Store();
        const std::vector<store::Event> open = store::Events(store).Open();
        return open.size() == 2 && !died_ms.contains(open[0].id) && !died_ms.contains(open[1].id);
    })) << Log();
    recorder.Signal(SIGTERM);
    ASSERT_TRUE(recorder.Wait());
    ExpectSound();
    for (const int camera : cameras) {
        for (const store::Event& event : EventsOf(camera)) {
            if (const auto died = died_ms.find(event.id); died != died_ms.end()) {
                const archive::Recording recording(Folder() / event.path);
                const std::int64_t end_ms = recording.StartWallMs() + recording.TimeOf(recording.FrameCount() - 1);
                EXPECT_LE(died->second - end_ms, 1000) << event.path;
            }
        }
    }
}

TEST_F(RecordingTest, AnAlarmIsKeptWithOrWithoutARecordingAroundIt) {
    for (const store::RecordMode mode : {store::RecordMode::kAlways, store::RecordMode::kNever}) {
        const int camera = AddCamera("test:mjpeg?size=160x120&fps=25");
        SetPlan(camera, mode);
        const Child recorder = StartRecorder();
        if (mode == store::RecordMode::kAlways) {
            ASSERT_TRUE(Eventually([&] { return !EventsOf(camera).empty(); })) << Log();
        }
        std::this_thread::sleep_for(seconds(2));  // time for a second of footage before the alarm
        store::Store store = Store();
        store::Marks marks(store);
        const int id = marks.Add(store::MarkKind::kAlert, camera, base::WallMillis() / 1000, 1, "door open").id;
        ASSERT_TRUE(Eventually([&] {
            const auto found = marks.Find(store::MarkKind::kAlert, id);
            return found && found->state == store::MarkState::kSaved;
        })) << Log();
        const archive::Recording span(Folder() / marks.Find(store::MarkKind::kAlert, id)->path);
        EXPECT_GT(span.FrameCount(), 40) << "two seconds of footage at least";
        SetPlan(camera, store::RecordMode::kNever);
    }
    ExpectSound();
}

}  // namespace

}  // namespace lookhaven::test
