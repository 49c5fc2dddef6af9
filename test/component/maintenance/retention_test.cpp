// SPDX-License-Identifier: Apache-2.0
//
// Old recordings make room: what goes, and all that must not go with it.
#include <algorithm>
#include <array>
#include <fstream>

#include <gmock/gmock.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"
#include "standalone/maintenance/verify.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/marks.h"
#include "standalone/store/shared_mounts.h"
#include "test/component/maintenance/retention_fixture.h"
#include "test/support/ordinary_user.h"

namespace lookhaven::maintenance {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;

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
    EXPECT_EQ(std::count(log.begin(), log.begin() + 60, 0), 60) << "no footage is logged for deleted recordings";
    EXPECT_EQ(std::count(log.begin() + 60, log.end(), 0), 0);
}

TEST_F(RetentionTest, OfASharedMountTheHostThatHasItsLeaseAloneDeletes) {
    const int old = footage_.Record(1, kNoon, 60);
    const int young = footage_.Record(1, kNoon + 100, 60);
    footage_.ShareMount(2);
    store::SharedMounts(footage_.Records()).TakeFree(footage_.MountId(), 1);
    EXPECT_THROW(Run(kEventBytes, 0, AgeLimit::kApplies, 2), store::LeaseLost);
    EXPECT_THAT(Left(), ElementsAre(old, young));
    EXPECT_EQ(Run(kEventBytes, 0, AgeLimit::kApplies, 1).events, 1);
    EXPECT_THAT(Left(), ElementsAre(young));
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

TEST_F(RetentionTest, ACameraOfALowerAgeLosesItsOwnRecordingsAlone) {
    const int others = footage_.Record(1, kNow - 900, 60);
    const int kept = footage_.Record(2, kNow - 900, 60);
    const int future = footage_.Record(2, kNow + 400 * 86400, 60);
    const int old = footage_.Record(2, kNow - 500, 60);
    const int of_removed = footage_.Record(3, kNow - 500, 60);
    const int young = footage_.Record(2, kNow - 60, 60);
    const int past = footage_.Record(2, 1000, 60);
    footage_.Mark(1, 2, kNow - 490, 5, "Door", old);
    store::KeptEvents(footage_.Records()).Keep(std::array{kept}, {});
    LimitAge(2, 100);
    LimitAge(3, 100);
    store::Cameras(footage_.Records()).Remove(3);
    EXPECT_EQ(Run(0, 0, AgeLimit::kWaits).events, 0);
    const DeletionResult removed = Run(0, 700);
    EXPECT_EQ(removed.events, 3) << "that of the mount's age, too";
    EXPECT_EQ(removed.marks, 1);
    EXPECT_THAT(Left(), ElementsAre(kept, of_removed, young, past)) << others << ", " << future << ", " << old;
}

TEST_F(RetentionTest, ACameraWhoseFilesCannotBeRemovedStopsNoOther) {
    const int stuck = footage_.Record(1, kNow - 900, 60);
    const int of_camera = footage_.Record(2, kNow - 500, 60);
    const int young = footage_.Record(2, kNow - 60, 60);
    const fs::path file = footage_.FileOf(stuck);
    fs::remove(file);
    fs::create_directory(file);
    LimitAge(1, 100);
    LimitAge(2, 100);
    EXPECT_THROW(Run(0), std::system_error);
    EXPECT_THAT(Left(), ElementsAre(stuck, young)) << of_camera;
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

TEST_F(RetentionTest, AFolderThatCannotBeOpenedIsNotAnAbsentOne) {
    const int event = footage_.Record(1, kNoon, 60);
    const fs::path camera = footage_.Mount() / "1";
    for (const fs::path& folder : {fs::path(folder_), footage_.Mount()}) {
        fs::permissions(folder, fs::perms(0755));
    }
    fs::permissions(camera, fs::perms::none);
    {
        const test::OrdinaryUser user;
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
