// SPDX-License-Identifier: Apache-2.0
//
// What a recorder's start makes of the files of one that was killed, where one of them is damaged or the disk fails.
#include "standalone/maintenance/mount_recovery.h"

#include <array>
#include <memory>

#include <gtest/gtest.h>

#include "standalone/base/installation.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/events.h"
#include "standalone/store/hosts.h"
#include "test/support/failing_status.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"
#include "test/support/footage/footage.h"
#include "test/support/ordinary_user.h"

namespace lookhaven::maintenance {
namespace {

namespace fs = std::filesystem;

constexpr std::int64_t kStartS = 1'772'366'400;
constexpr int kEvents = 3;

class RecoveryTest : public testing::Test {
  protected:
    // Recordings of one camera each, by the host of the same number where a test has hosts, cut off before their end.
    RecoveryTest() {
        fs::permissions(folder_.Path(), fs::perms(0755));
        MountFolder::WriteMarker(footage_.Mount(), MarkerFor(footage_.Records(), footage_.MountId()));
        fs::permissions(footage_.Mount() / ".lookhaven-mount", fs::perms(0644));
        store::Events events(footage_.Records());
        for (int camera = 1; camera <= kEvents; ++camera) {
            store::Event row;
            row.id = events.ReserveIds(1, camera);
            row.camera_id = row.host_id = camera;
            row.mount_id = footage_.MountId();
            row.start_s = row.end_s = kStartS;
            row.recording = true;
            const archive::FileName name{camera, kStartS, row.id, archive::FileKind::kRecording};
            row.path = archive::PathOf(name);
            archive::MakeFolderFor(footage_.Mount(), name);
            test::Record(test::MakeClip(test::kMjpeg), footage_.Mount() / row.path, false);
            events.Begin(row);
        }
        for (const auto& entry : fs::recursive_directory_iterator(footage_.Mount())) {
            fs::permissions(entry, entry.is_directory() ? fs::perms(0777) : fs::perms(0666));
        }
    }

    bool Run(const MountRole& role = {}) {
        const test::OrdinaryUser user;
        const store::Mount mount = store::Mounts(footage_.Records()).Find(footage_.MountId()).value();
        return Recover(footage_.Records(), mount, 1000, kStartS + 3600, role);
    }

    fs::path FileOf(int event) { return footage_.FileOf(event); }

    // A digit for each event: open, closed, or absent.
    std::string Rows() {
        std::string text;
        for (int id = 1; id <= kEvents; ++id) {
            const auto row = store::Events(footage_.Records()).Find(id);
            text += !row ? "-" : row->recording ? "o" : "c";
        }
        return text;
    }

    const test::ArchiveFolder folder_;
    test::Footage footage_{(base::Installation::CreateFolders(folder_.Path()),
                            store::Store::Migrate(base::Installation(folder_.Path()).StoreUrl()),
                            base::Installation(folder_.Path()).StoreUrl()),
                           folder_.Path()};
};

TEST_F(RecoveryTest, ADiskThatFailsEndsThePassUntilItIsBack) {
    const fs::path day = FileOf(2).parent_path();
    const fs::path index = archive::IndexPathOf(FileOf(2));
    const struct {
        const char* what;
        fs::path file;
        fs::perms left, usual;
    } rows[] = {
        {"a day that cannot be opened", day, fs::perms::none, fs::perms(0777)},
        {"a day whose files cannot be looked at", day, fs::perms(0444), fs::perms(0777)},
        {"a camera that cannot be opened", day.parent_path(), fs::perms::none, fs::perms(0777)},
        {"a day that takes no file", day, fs::perms(0555), fs::perms(0777)},
        {"a recording that cannot be read", FileOf(2), fs::perms::none, fs::perms(0666)},
        {"an index that cannot be read", index, fs::perms::none, fs::perms(0666)},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.what);
        const std::string recorded = test::Contents(FileOf(2));
        fs::permissions(row.file, row.left);
        EXPECT_THROW(Run(), std::system_error);
        fs::permissions(row.file, row.usual);
        EXPECT_EQ(Rows(), "coo") << "those after it are as they were";
        EXPECT_EQ(test::Contents(FileOf(2)), recorded);
    }
    EXPECT_TRUE(Run());
    EXPECT_EQ(Rows(), "ccc");
}

TEST_F(RecoveryTest, WhatIsWrongWithOneFileCostsThatFileAlone) {
    fs::remove(archive::IndexPathOf(FileOf(1)));
    auto growing =
        std::make_unique<archive::FrameIndexWriter>(archive::IndexPathOf(FileOf(1)), test::PlainHeader(kStartS * 1000));
    test::Write(FileOf(2), "");
    EXPECT_FALSE(Run()) << "another program still writes to the first";
    EXPECT_EQ(Rows(), "o-c");
    growing.reset();
    EXPECT_TRUE(Run());
    EXPECT_EQ(Rows(), "c-c");
}

TEST_F(RecoveryTest, OfASharedMountEachHostRecoversItsOwnAndTheMaintainerWhatRemovedOnesHaveLeft) {
    store::Hosts hosts(footage_.Records());
    footage_.ShareMount(3);
    EXPECT_TRUE(Run({.host = 2}));
    EXPECT_EQ(Rows(), "oco");
    EXPECT_TRUE(Run({.host = 2, .is_maintainer = true}));
    EXPECT_EQ(Rows(), "oco") << "they may be cut off from the store, and write on";
    hosts.Remove(1);
    EXPECT_TRUE(Run({.host = 2}));
    EXPECT_EQ(Rows(), "oco");
    EXPECT_TRUE(Run({.host = 2, .is_maintainer = true}));
    EXPECT_EQ(Rows(), "cco");
    store::Events(footage_.Records())
        .Remove(std::array{1, 2, 3});  // files without rows: by the host that has reserved their ids
    EXPECT_TRUE(Run({.host = 2}));
    EXPECT_EQ(Rows(), "-c-");
    EXPECT_TRUE(Run({.host = 2, .is_maintainer = true}));
    EXPECT_EQ(Rows(), "cc-");
}

// Only the listing finds a recording that has no row: what it leaves out is never imported.
TEST_F(RecoveryTest, ARecordingThatCannotBeLookedAtIsNotPassedOver) {
    const std::string name = FileOf(2).filename();
    test::g_unreadable = name.c_str();
    store::Events(footage_.Records()).Remove(std::array{1, 2, 3});
    EXPECT_THROW(Run(), std::system_error);
    EXPECT_EQ(Rows(), "---") << "nothing is imported before all is listed";
    test::g_unreadable = nullptr;
    EXPECT_TRUE(Run());
    EXPECT_EQ(Rows(), "ccc");
}

}  // namespace
}  // namespace lookhaven::maintenance
