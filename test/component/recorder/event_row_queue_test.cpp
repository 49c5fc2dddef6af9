// SPDX-License-Identifier: Apache-2.0
//
// Up to when a camera's rows are said to be in the store, by which the footage of alerts is judged complete.
#include "standalone/recorder/event_row_queue.h"

#include <array>

#include <gtest/gtest.h>

#include "standalone/base/clock.h"
#include "standalone/base/installation.h"
#include "standalone/store/connection.h"
#include "standalone/store/recorder_lease.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/wait.h"

namespace lookhaven::recorder {
namespace {

constexpr std::int64_t kDelayS = 3;  // that a frame may take until its row is put

class EventRowQueueTest : public testing::Test {
  protected:
    EventRowQueueTest() {
        base::Installation::CreateFolders(home_.Path());
        store::Store::Migrate(url_);
        store_.emplace(store::Store::Open(url_));
        rows_.emplace(url_, "this recorder", 0, LeaseTimes{.renew_us = 100'000});
    }

    store::Event Row(std::int64_t start_s, bool recording) {
        store::Event row;
        row.id = store::Events(*store_).NextId();
        row.camera_id = 1;
        row.mount_id = 1;
        row.start_s = start_s;
        row.end_s = start_s + 10;
        row.recording = recording;
        row.path = archive::PathOf({1, start_s, row.id, archive::FileKind::kRecording});
        return row;
    }

    bool BecomesStored(int camera, std::int64_t until_s) {
        return test::Eventually(std::chrono::seconds(30),
                                [&] { return rows_->HasStored(camera, until_s) || (rows_->Refresh(1), false); });
    }

    void Sql(const std::string& statement) {
        store::Connection(store::StoreAddress::Parse(url_)).Write([&](soci::session& sql) { sql << statement; });
    }

    const test::ArchiveFolder home_;
    const std::string url_ = base::Installation(home_.Path()).StoreUrl();
    std::optional<store::Store> store_;
    std::optional<EventRowQueue> rows_;
};

TEST_F(EventRowQueueTest, OnlyWhatIsInTheStoreIsSaidToBe) {
    EXPECT_TRUE(BecomesStored(2, base::WallSeconds() - 60)) << "nothing is recorded of it, so no row can come";
    EXPECT_FALSE(rows_->HasStored(2, base::WallSeconds() + 60)) << "nobody knows yet";

    rows_->NoteWritten(1, 1000);
    EXPECT_TRUE(BecomesStored(1, 1000 - kDelayS));
    EXPECT_FALSE(rows_->HasStored(1, 1001 - kDelayS)) << "the row of a frame may still be on its way";

    store::Event growing = Row(1000, true);
    Sql("alter table events rename to away");
    rows_->Put(growing);
    rows_->NoteWritten(1, 2000);
    rows_->Refresh(1);
    EXPECT_FALSE(rows_->HasStored(1, 1001 - kDelayS)) << "the store is unavailable";
    const auto heartbeat = [this] { return store::RecorderLease(*store_).Current().count; };
    EXPECT_TRUE(test::Eventually(std::chrono::seconds(30), [&, seen = heartbeat()] {
        return heartbeat() > seen + 1 || (rows_->Refresh(1), false);
    })) << "other hosts must not take its cameras";
    Sql("alter table away rename to events");
    EXPECT_TRUE(BecomesStored(1, 2000 - kDelayS));
    EXPECT_TRUE(store::Events(*store_).Find(growing.id)) << "reported as stored before it was";
    EXPECT_TRUE(rows_->HasUnstored(1)) << "it is still to be finished";

    growing.recording = false;
    growing.frame_count = 250;
    rows_->Put(growing);
    rows_->NoteWritten(1, 3000);
    EXPECT_TRUE(BecomesStored(1, 3000 - kDelayS));
    EXPECT_EQ(store::Events(*store_).Find(growing.id)->frame_count, 250);
    EXPECT_FALSE(rows_->HasUnstored(1));

    rows_->NoteEnded(1);
    EXPECT_TRUE(BecomesStored(1, base::WallSeconds() - 60)) << "its recording has ended, so no row can come";
}

TEST_F(EventRowQueueTest, ARowThatVerifyHasImportedMeanwhileGetsItsLastState) {
    store::Event row = Row(1000, false);
    store::Events(*store_).Begin(row);
    row.frame_count = 250;
    rows_->Put(row);
    rows_->NoteWritten(1, 2000);
    EXPECT_TRUE(BecomesStored(1, 2000 - kDelayS));
    EXPECT_EQ(store::Events(*store_).Find(row.id)->frame_count, 250) << "reported as stored before it was";
    EXPECT_FALSE(rows_->HasUnstored(1));
}

}  // namespace
}  // namespace lookhaven::recorder
