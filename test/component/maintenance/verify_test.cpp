// SPDX-License-Identifier: Apache-2.0
//
// What verify finds and repairs when rows, recordings and indexes disagree: real recordings, damaged one way at a time.
#include "standalone/maintenance/verify.h"

#include <array>
#include <functional>
#include <map>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/archive/recording_reader.h"
#include "standalone/base/installation.h"
#include "standalone/maintenance/marks.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/marks.h"
#include "standalone/store/recorder_lease.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"
#include "test/support/footage/footage.h"
#include "test/support/ordinary_user.h"

namespace lookhaven::maintenance {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

constexpr std::int64_t kStartS = 1'772'366'400;
constexpr int kFrames = 100;

class VerifyTest : public testing::Test {
  protected:
    // An installation with one recording, its row and an alert over it.
    VerifyTest() {
        MountFolder::WriteMarker(footage_.Mount(), MarkerFor(footage_.Records(), footage_.MountId()));
        event_ = footage_.Record(1, kStartS, 4);
        file_ = footage_.FileOf(event_);
        fs::remove(file_);
        fs::remove(Index());
        test::Record(test::MakeClip(test::kH264), file_, true, SIZE_MAX, kStartS * 1000);
        store::Events(Records()).Finish(event_, kStartS + 4, kFrames, 1);
        mark_ = footage_.Mark(1, 1, kStartS + 1, 2, "Door", event_);
        Age();
    }

    // What has only just been written may still get its row.
    void Age() const {
        for (const auto& entry : fs::recursive_directory_iterator(footage_.Mount())) {
            fs::last_write_time(entry, fs::file_time_type::clock::now() - std::chrono::hours(1));
        }
    }

    store::Store& Records() { return footage_.Records(); }
    fs::path Index() const { return archive::IndexPathOf(file_); }
    fs::path Span() { return footage_.Mount() / store::Marks(Records()).Find(store::MarkKind::kAlert, mark_)->path; }
    store::Event Row() { return store::Events(Records()).Find(event_).value_or(store::Event{}); }
    void Flip(const fs::path& file, std::size_t at) const {
        std::string bytes = test::Contents(file);
        bytes.at(at) ^= 4;
        test::Write(file, bytes);
    }

    // Everything that verify could change.
    std::map<std::string, std::string> State() {
        std::map<std::string, std::string> state;
        for (const auto& entry : fs::recursive_directory_iterator(footage_.Mount())) {
            if (entry.is_regular_file()) {
                state[entry.path()] = test::Contents(entry.path());
            }
        }
        store::Events(Records()).VisitMount(footage_.MountId(), [&](const store::Event& row) {
            state["row " + std::to_string(row.id)] = row.path + (row.recording ? " open " : " ") +
                                                     std::to_string(row.frame_count) + " " + std::to_string(row.end_s);
        });
        return state;
    }

    const test::ArchiveFolder folder_;
    test::Footage footage_{(base::Installation::CreateFolders(folder_.Path()),
                            store::Store::Migrate(base::Installation(folder_.Path()).StoreUrl()),
                            base::Installation(folder_.Path()).StoreUrl()),
                           folder_.Path()};
    int event_ = 0;
    int mark_ = 0;
    fs::path file_;
};

struct Damage {
    const char* what;
    std::function<void()> happens;
    const char* problem;  // in the first fault's sentence; empty: none is found
    const char* done;     // in what repair says of it; empty: it is left as it is
    int frames;           // that the row and its recording have then; 0: there is no row
};

TEST_F(VerifyTest, FindsAndRepairsEachKindOfDamage) {
    const std::string recording = test::Contents(file_);
    const std::string index = test::Contents(Index());
    const fs::path day = file_.parent_path();
    const std::size_t cluster = recording.find("\x1f\x43\xb6\x75", recording.size() / 2);
    store::Events events(Records());
    const store::Event row = Row();
    const auto change_row = [&](const std::function<void(store::Event&)>& change) {
        store::Event changed = row;
        change(changed);
        events.Remove(std::array{event_});
        events.Begin(changed);
        if (!changed.recording) {
            events.Finish(event_, changed.end_s, changed.frame_count, changed.size_bytes);
        }
    };
    const Damage rows[] = {
        {"none", [] {}, "", "", kFrames},
        {"unknown files", [&] { test::Write(day / "holiday.mkv", "mine"); }, "", "", kFrames},
        {"no index", [&] { fs::remove(Index()); }, "No such file", "closed", kFrames},
        {"an empty index", [&] { test::Write(Index(), ""); }, "is empty", "closed", kFrames},
        {"a foreign index", [&] { test::Write(Index(), std::string(500, 'x')); }, "not a frame index", "closed",
         kFrames},
        {"a cut index", [&] { fs::resize_file(Index(), 64 + 24 * 30 + 5); }, "name its frames", "closed", kFrames},
        {"a bit of the index's head", [&] { Flip(Index(), 20); }, "damaged head", "closed", kFrames},
        {"a bit of an index entry", [&] { Flip(Index(), 64 + 24 * 50); }, "is damaged", "closed", kFrames},
        {"an unfinished index", [&] { test::Write(Index(), index.substr(0, 63) + '\0' + index.substr(64)); },
         "never closed", "closed", kFrames},
        {"a cut recording", [&] { fs::resize_file(file_, cluster + 20); }, "does not say", "closed", kFrames * 6 / 10},
        {"damage within", [&] { Flip(file_, cluster); }, "damaged after frame 60", "", kFrames},
        {"an empty recording", [&] { test::Write(file_, ""); }, "cannot be read", "removed", 0},
        {"a foreign recording", [&] { test::Write(file_, "Dear aunt"); }, "cannot be read", "left", 0},
        {"no recording", [&] { fs::remove(file_); }, "has no file", "removed", 0},
        {"a wrong count", [&] { change_row([](store::Event& event) { event.frame_count = 7; }); }, "does not say",
         "closed", kFrames},
        {"an open row", [&] { change_row([](store::Event& event) { event.recording = true; }); }, "does not say",
         "closed", kFrames},
        {"no row", [&] { events.Remove(std::array{event_}); }, "no event has the file", "imported", kFrames},
        {"a row that leads away", [&] { change_row([](store::Event& event) { event.path = "../../etc/passwd"; }); },
         "names no recording", "removed the event", kFrames},
        {"a lonely index", [&] { fs::copy(Index(), day / "130000-1.index"); }, "no recording to", "removed", kFrames},
        {"a lonely span", [&] { fs::copy(Span(), day / "130000-1.span"); }, "no mark has", "removed", kFrames},
        {"a foreign span", [&] { test::Write(Span(), "x"); }, "span of mark", "written again", kFrames},
        {"no span", [&] { fs::remove(Span()); }, "span of mark", "written again", kFrames},
    };
    for (const Damage& each : rows) {
        SCOPED_TRACE(each.what);
        each.happens();
        Age();
        const auto damaged = State();
        const VerifyReport found = Verify(Records(), false);
        EXPECT_EQ(State(), damaged) << "verify without --repair changed something";
        const VerifyReport repaired = Verify(Records(), true);
        ASSERT_EQ(found.faults.empty(), *each.problem == '\0');
        if (!found.faults.empty()) {
            EXPECT_THAT(found.faults.front().problem, HasSubstr(each.problem));
            EXPECT_THAT(found.faults.front().problem, testing::AnyOf(HasSubstr(folder_.Path()), HasSubstr("event 1")));
            EXPECT_THAT(repaired.faults.front().done, HasSubstr(each.done));
        }
        if (*each.done == '\0') {
            EXPECT_EQ(State(), damaged) << "repair changed what it cannot repair";
        } else if (each.done != std::string("left")) {
            EXPECT_THAT(Verify(Records(), false).faults, testing::IsEmpty());
        }
        EXPECT_EQ(Row().frame_count, each.frames);
        if (each.frames > 0) {
            EXPECT_EQ(archive::RecordingReader(file_).FrameCount(), each.frames);
        }
        fs::create_directories(day);
        test::Write(file_, recording);
        test::Write(Index(), index);
        change_row([](store::Event&) {});
        SaveMark(Records(), *store::Marks(Records()).Find(store::MarkKind::kAlert, mark_));
    }
}

// A new store beside old storage: the index of a lost row is worth more than tidiness.
TEST_F(VerifyTest, AStoreThatKnowsNothingTakesInAndRemovesNothing) {
    const fs::path stray = file_.parent_path() / "130000-77.index";
    fs::copy(Index(), stray);
    store::Events(Records()).Remove(std::array{event_});
    Age();
    Verify(Records(), true);
    EXPECT_TRUE(fs::exists(stray));
    EXPECT_EQ(Row().frame_count, kFrames);
}

TEST_F(VerifyTest, AForeignNumberIsGivenAnotherAndADiskThatIsAwayIsLeftAlone) {
    const fs::path foreign = file_.parent_path() / "130000-4711.mkv";
    fs::copy(file_, foreign);
    Age();
    EXPECT_THAT(Verify(Records(), true).faults.front().done, HasSubstr("imported"));
    EXPECT_FALSE(fs::exists(foreign));
    EXPECT_THAT(Verify(Records(), false).faults, testing::IsEmpty());
    // A number that a restored store gave out again, and one whose row a recorder may still have in memory.
    store::Events events(Records());
    const fs::path taken = file_.parent_path() / ("125000-" + std::to_string(event_) + ".mkv");
    const int reserved = events.NextIds(2);
    const fs::path in_reserve = file_.parent_path() / ("140000-" + std::to_string(reserved) + ".mkv");
    store::RecorderLease lease(Records());
    lease.Take(0, "recorder", reserved);
    for (const fs::path& file : {taken, in_reserve}) {
        fs::copy(file_, file);
    }
    fs::create_directory(footage_.Mount() / "12");
    Age();
    const std::vector<Fault> faults = Verify(Records(), true).faults;
    ASSERT_EQ(faults.size(), 2U);
    EXPECT_THAT(faults[0].done, HasSubstr("imported"));
    EXPECT_EQ(faults[1].done, "") << faults[1].problem;
    EXPECT_TRUE(fs::exists(in_reserve) && !fs::exists(taken) && !events.Find(reserved));
    lease.Release(1, "recorder");
    EXPECT_THAT(Verify(Records(), true).faults.front().done, HasSubstr("imported"));
    EXPECT_TRUE(fs::exists(in_reserve) && events.Find(reserved)) << "nobody else can have its number";
    EXPECT_TRUE(std::ranges::is_sorted(events.InRecordingOrder(footage_.MountId(), {}, 9), {}, &store::Event::start_s))
        << "a new id does not change the order of recording";
    EXPECT_THAT(Verify(Records(), false).faults, testing::IsEmpty());
    store::Camera camera;
    camera.name = "New";
    camera.profiles = {{0, "test:mjpeg", 0, 0, 0}};
    EXPECT_EQ(store::Cameras(Records()).Add(camera), 13) << "not the number of footage that is there";
    fs::remove(footage_.Mount() / ".lookhaven-mount");
    const auto before = State();
    EXPECT_THAT(Verify(Records(), true).faults.front().problem, HasSubstr("is not there, with 4 events"));
    EXPECT_EQ(State(), before);
}

// Other errors than that a file is absent: neither its row nor another's is touched.
TEST_F(VerifyTest, AFolderThatCannotBeReadEndsTheWorkOnItsMountAndLosesNothing) {
    store::Events events(Records());
    const fs::path day = file_.parent_path();
    const int later = footage_.Record(2, kStartS + 86400, 4);
    fs::remove(footage_.FileOf(later));  // so that repair has something to do after the failure
    const fs::path stray = footage_.Mount() / "3/2026-03-02/120000-4711.mkv";
    fs::create_directories(stray.parent_path());
    fs::copy(file_, stray);
    Age();
    const auto before = State();
    for (const fs::path& folder : {folder_.Path(), footage_.Mount()}) {
        fs::permissions(folder, fs::perms(0755));
    }
    for (const auto& entry : fs::recursive_directory_iterator(footage_.Mount())) {
        fs::permissions(entry, entry.is_directory() ? fs::perms(0777) : fs::perms(0666));
    }
    const struct {
        const char* what;
        fs::path folder;
        fs::perms left;
    } rows[] = {
        {"a day that cannot be opened", day, fs::perms::none},
        {"a day whose files cannot be looked at", day, fs::perms(0444)},
        {"a camera that cannot be opened", day.parent_path(), fs::perms::none},
        {"a camera whose days cannot be looked at", day.parent_path(), fs::perms(0444)},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.what);
        fs::permissions(row.folder, row.left);
        for (const bool repair : {false, true}) {
            std::vector<Fault> faults;
            {
                const test::OrdinaryUser user;
                faults = Verify(Records(), repair).faults;
            }
            ASSERT_FALSE(faults.empty());
            EXPECT_THAT(faults.back().problem, HasSubstr("was not checked further: "));
            EXPECT_THAT(faults.back().problem, HasSubstr("Permission denied"));
            EXPECT_EQ(repair, faults.size() == 1) << "repair stops at the first failure, a check goes on";
            fs::permissions(row.folder, fs::perms(0777));
            EXPECT_TRUE(State() == before) << (repair ? "repair" : "look");
            fs::permissions(row.folder, row.left);
        }
        fs::permissions(row.folder, fs::perms(0777));
    }
    Verify(Records(), true);
    EXPECT_FALSE(events.Find(later)) << "it goes on with the others once it can";
    EXPECT_FALSE(fs::exists(stray)) << "imported, with an id of its own";
}

TEST_F(VerifyTest, ASpanThatTheDiskDoesNotGiveIsNotWrittenAnew) {
    for (const fs::path& folder : {folder_.Path(), footage_.Mount()}) {
        fs::permissions(folder, fs::perms(0755));
    }
    for (const auto& entry : fs::recursive_directory_iterator(footage_.Mount())) {
        fs::permissions(entry, entry.is_directory() ? fs::perms(0777) : fs::perms(0666));
    }
    fs::permissions(Span(), fs::perms::none);
    const test::OrdinaryUser user;
    const std::vector<Fault> faults = Verify(Records(), true).faults;
    ASSERT_EQ(faults.size(), 1U);
    EXPECT_THAT(faults.front().problem, HasSubstr("was not checked further: "));
    EXPECT_EQ(faults.front().done, "");
}

}  // namespace
}  // namespace lookhaven::maintenance
