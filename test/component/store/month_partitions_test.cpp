// SPDX-License-Identifier: Apache-2.0
//
// Events and marks by the month in PostgreSQL: how an earlier store comes to that, and what is made, moved and dropped.
#include "standalone/store/month_partitions.h"

#include <algorithm>
#include <atomic>
#include <iterator>
#include <limits>
#include <string>
#include <tuple>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/store/copy.h"
#include "standalone/store/events.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/marks.h"
#include "standalone/store/row_search.h"
#include "standalone/store/schema.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;

constexpr std::int64_t kOld = 1'577'880'000;  // 2020-01-01
constexpr std::int64_t kFuture = 4'000'000'000;
constexpr int kNoId = std::numeric_limits<int>::max();

class MonthPartitionsTest : public EmptyStore {
  protected:
    static Event EventAt(std::int64_t start_s) {
        Event event;
        event.camera_id = 5;
        event.mount_id = 1;
        event.start_s = start_s;
        event.end_s = start_s + 10;
        return event;
    }

    std::string PartitionOf(const std::string& table, int id) {
        return Ask("select cast(tableoid as regclass) || '' from " + table + " where id = " + std::to_string(id));
    }

    std::string Partitions() {
        return Ask("select coalesce(string_agg(relname, ' ' order by relname), '') from pg_inherits join pg_class"
                   " on pg_class.oid = inhrelid where relkind = 'r'");
    }

    // "2026_12", in so many minutes from now.
    std::string MonthIn(int minutes) {
        return Ask("select to_char(now() at time zone 'UTC' + interval '" + std::to_string(minutes) +
                   " minutes', 'YYYY_MM')");
    }
};

TEST_P(MonthPartitionsTest, AnEarlierStoreKeepsItsRowsWhereTheyAre) {
    int version = 0;
    for (const Migration& migration : Migrations()) {
        if (migration.purpose == "partitions by month") {
            break;
        }
        for (const auto& statements : {migration.statements, migration.on_postgresql}) {
            std::ranges::for_each(statements, [this](const char* statement) { Force(statement); });
        }
        ++version;
    }
    Force("create table schema_version (version integer not null)");
    Force("insert into schema_version (version) values (" + std::to_string(version) + ")");
    const std::int64_t now_s = base::WallSeconds();
    int id = 0;
    for (const std::int64_t start_s : {kOld, now_s, kFuture}) {
        const std::string times = std::to_string(start_s) + ", " + std::to_string(start_s + 10);
        Force("insert into events values (" + std::to_string(++id) + ", 5, 1, " + times +
              ", 0, 1, 0, 0, 3, '', 0, 0, 'x', 1, 0, 9)");
        Force("insert into marks values (" + std::to_string(id + 10) + ", 1, 5, " + std::to_string(start_s) + ", " +
              times + ", 'Total', 1, 1, 'x', 0)");
        Force("insert into kept_events values (" + std::to_string(id) + ", 'note', '', 0)");
    }
    EXPECT_EQ(Store::Migrate(url_), Store::SchemaVersion() - version);
    Store store = Store::Open(url_);
    MaintainPartitions(store);
    for (const auto& [event, mark, part] :
         {std::tuple(1, 11, "_earlier"), std::tuple(2, 12, "_earlier"), std::tuple(3, 13, "_default")}) {
        EXPECT_EQ(Events(store).Find(event)->order, 9);
        EXPECT_EQ(KeptEvents(store).Find(event)->note, "note");
        EXPECT_EQ(PartitionOf("events", event), std::string("events") + part);
        EXPECT_EQ(Marks(store).Find(MarkKind::kAlert, mark)->text, "Total");
        EXPECT_EQ(PartitionOf("marks", mark), std::string("marks") + part);
    }
    EXPECT_THAT(Events(store).CamerasOn(0), ElementsAre(5));
    EXPECT_EQ(Marks(store).List({.camera_ids = {5}, .words = TextQuery("total")}).size(), 3);
    EXPECT_EQ(Ask("select count(*) || '' from pg_index join pg_class on pg_class.oid = indexrelid"
                  " where relname like '%\\_earlier' and not exists"
                  " (select from pg_inherits where inhrelid = indexrelid)"),
              "0")
        << "an index that was there is used, and no second one made";
    Events(store).Remove(std::vector{1});
    EXPECT_EQ(KeptEvents(store).Find(1), std::nullopt);
}

TEST_P(MonthPartitionsTest, AreMadeForWhatIsRecordedAndDroppedOnceTheyAreEmpty) {
    Store::Migrate(url_);
    const std::string month = MonthIn(0);
    if (MonthIn(10) != month) {
        GTEST_SKIP() << "the month ends";
    }
    Store store = Store::Open(url_);
    Events events(store);
    EXPECT_EQ(Partitions(), "events_default marks_default") << "recording need not wait for the others";
    const std::int64_t now_s = base::WallSeconds();
    events.AddAll(std::vector(kMinEventsForPartition, EventAt(kOld)));
    const int last = events.NextIds(3) + 2;
    events.AddAll(std::vector{EventAt(now_s), EventAt(kFuture), EventAt(kOld - 86'400)});
    KeptEvents(store).Keep(std::vector{1}, {"note", "", 0});
    Cameras(store).Add({.name = "Gate", .profiles = {{.source = "test:mjpeg"}}});
    const int mark = Marks(store).Add(MarkKind::kAlert, 1, kOld + 60, 0, "with footage").id;
    const int claimed = Marks(store).Add(MarkKind::kAlert, 1, kOld + 86'400 * 70, 0, "without").id;
    std::atomic<int> working = 2;
    std::atomic<bool> is_reader = true;
    InParallel(3, [&] {
        Store other = Store::Open(url_);
        if (!is_reader.exchange(false)) {
            MaintainPartitions(other);
            --working;
        }
        while (working > 0) {
            EXPECT_TRUE(Events(other).Find(2)) << "while it is moved";
        }
    });
    const std::string next =
        Ask("select to_char(date_trunc('month', now() at time zone 'UTC') + interval '1 month', 'YYYY_MM')");
    EXPECT_EQ(Partitions(), "events_2020_01 events_" + month + " events_" + next + " events_default marks_2020_01" +
                                " marks_" + month + " marks_" + next + " marks_default");
    EXPECT_EQ(PartitionOf("events", 1), "events_2020_01");
    EXPECT_EQ(PartitionOf("events", last + 1), "events_" + month);
    EXPECT_EQ(PartitionOf("events", last + 2), "events_default");
    EXPECT_EQ(PartitionOf("events", last + 3), "events_default") << "one alone is not worth a partition";
    EXPECT_EQ(PartitionOf("marks", mark), "marks_2020_01");
    EXPECT_EQ(PartitionOf("marks", claimed), "marks_default");
    EXPECT_EQ(KeptEvents(store).Find(1)->note, "note") << "moving an event is not removing it";
    EXPECT_EQ(events.Find(1)->start_s, kOld);
    EXPECT_EQ(Marks(store).Find(MarkKind::kAlert, mark)->text, "with footage");
    EXPECT_THROW(events.Begin(With(EventAt(now_s), &Event::id, 1)), AlreadyExists) << "of another month";
    Force("delete from events where start_s = " + std::to_string(kOld));
    EXPECT_EQ(KeptEvents(store).Find(1), std::nullopt);
    Force("insert into event_cameras (camera_id, mount_id) values (6, 1)");
    MaintainPartitions(store);
    EXPECT_THAT(events.CamerasOn(1), ElementsAre(5)) << "a pair without events is removed";
    EXPECT_EQ(Partitions(), "events_" + month + " events_" + next + " events_default marks_2020_01 marks_" + month +
                                " marks_" + next + " marks_default");
}

TEST_P(MonthPartitionsTest, AMonthWithTooMuchToMoveOrAFaultKeepsNoOtherFromBeingMade) {
    Store::Migrate(url_);
    Store store = Store::Open(url_);
    for (const std::int64_t start_s : {kOld, kOld + 40 * 86'400, kOld + 70 * 86'400}) {
        Events(store).AddAll(std::vector(kMinEventsForPartition, EventAt(start_s)));
    }
    Force("insert into marks select n, 1, 5, 0, " + std::to_string(kOld) +
          ", 0, '', 2, 0, '', 0 from generate_series(1, 30001) as n");
    Force("create table events_2020_03 (id integer)");
    EXPECT_THROW(MaintainPartitions(store), StoreError);
    EXPECT_EQ(PartitionOf("events", 1), "events_2020_01");
    EXPECT_EQ(PartitionOf("marks", 1), "marks_default");
    EXPECT_EQ(PartitionOf("events", kMinEventsForPartition + 1), "events_2020_02");
    EXPECT_EQ(PartitionOf("events", 2 * kMinEventsForPartition + 1), "events_default");
}

TEST_P(MonthPartitionsTest, ManyEventsOfACameraAreRemovedAtOnce) {
    Store::Migrate(url_);
    Store store = Store::Open(url_);
    Events(store).AddAll(std::vector{EventAt(kOld), With(EventAt(kOld), &Event::demo, true)});
    for (const int camera : {5, 6}) {
        Force("insert into events select n * 10 + " + std::to_string(camera) + ", " + std::to_string(camera) +
              ", mount_id, start_s, end_s, recording, reason, frame_count, size_bytes, video_type, audio_codec, width,"
              " height, path, archived, demo, recording_order, host_id"
              " from events, generate_series(1, 20000) as n where id = 2");
    }
    EXPECT_THAT(Events(store).CamerasOn(1), ElementsAre(5, 6));
    EXPECT_EQ(Events(store).RemoveDemo(), 40'001);
    EXPECT_THAT(Events(store).CamerasOn(1), ElementsAre(5));
}

TEST_P(MonthPartitionsTest, AnIdIsLookedForWhereItWasGivenOutAndThenEverywhere) {
    Store::Migrate(url_);
    Store store = Store::Open(url_);
    const auto span_of = [&store](int id) {
        return store.connection().Read([id](soci::session& sql) { return ProbableStarts(sql, id); });
    };
    constexpr auto kNoEnd = std::numeric_limits<std::int64_t>::max();
    EXPECT_EQ(span_of(3), (StartSpan{0, kNoEnd}));
    Force("insert into month_first_ids values (" + std::to_string(kOld) + ", 3), (" + std::to_string(kFuture) + ", 6)");
    EXPECT_EQ(span_of(2), (StartSpan{0, kOld + 86'400}));
    EXPECT_EQ(span_of(3), (StartSpan{kOld, kFuture + 86'400}));
    EXPECT_EQ(span_of(6), (StartSpan{kFuture, kNoEnd}));
    Events(store).AddAll(std::vector{EventAt(kFuture + 86'400), EventAt(kOld)});
    for (const int id : {1, 2}) {
        EXPECT_EQ(Events(store).Find(id).value_or(Event()).id, id);
    }
    EXPECT_EQ(Events(store).Find(3), std::nullopt);
}

// The days next to where an answer begins are read first, and the rest only where that is not enough.
TEST_P(MonthPartitionsTest, WhatLiesMonthsApartIsReadInOrder) {
    Store::Migrate(url_);
    Store store = Store::Open(url_);
    Cameras(store).Add({.name = "Gate", .profiles = {{.source = "test:mjpeg"}}});
    const std::int64_t now_s = base::WallSeconds();
    std::vector<std::int64_t> starts;
    std::vector<Event> events;
    std::vector<Mark> marks;
    for (const int days : {-400, -369, -100, -41, -31, -1, 0, 40, 200}) {
        starts.push_back(now_s + days * 86'400);
        events.push_back(With(EventAt(starts.back()), &Event::camera_id, days % 2 == 0 ? 1 : 2));
        Mark mark;
        mark.camera_id = events.back().camera_id;
        mark.start_s = mark.moment_s = starts.back();
        mark.end_s = mark.start_s + 10;
        mark.text = "total";
        mark.state = MarkState::kSaved;
        marks.push_back(mark);
    }
    Events(store).AddAll(events);
    Marks(store).AddAll(marks);
    const auto starts_of = [](const auto& rows) {
        std::vector<std::int64_t> found;
        std::ranges::transform(rows, std::back_inserter(found), [](const auto& row) { return row.start_s; });
        return found;
    };
    const int count = static_cast<int>(starts.size());
    for (const bool newest_first : {false, true}) {
        std::vector<std::int64_t> all = starts;
        if (newest_first) {
            std::ranges::reverse(all);
        }
        for (int offset = 0; offset <= count; ++offset) {
            for (const int limit : {1, 3, count}) {
                const std::vector<std::int64_t> expected(all.begin() + offset,
                                                         all.begin() + std::min(offset + limit, count));
                const auto lists = [&](auto filter) {
                    filter.camera_ids = {1, 2};
                    filter.newest_first = newest_first;
                    filter.offset = offset;
                    filter.limit = limit;
                    filter.begin_s = starts.front();
                    return filter;
                };
                EXPECT_EQ(starts_of(Events(store).List(lists(EventFilter()))), expected) << offset << ' ' << limit;
                EXPECT_EQ(starts_of(Marks(store).List(lists(MarkFilter()))), expected) << offset << ' ' << limit;
                MarkFilter words = lists(MarkFilter());
                words.words = TextQuery("total");
                EXPECT_EQ(starts_of(Marks(store).List(words)), expected) << offset << ' ' << limit;
            }
        }
        for (int i = 0; i + 1 < count; ++i) {
            const Step step{{1, 2}, all.at(i), newest_first ? 0 : kNoId, newest_first};
            EXPECT_EQ(Events(store).Next(step, Reasons::kAny).value_or(Event()).start_s, all.at(i + 1)) << i;
            EXPECT_EQ(Marks(store).Next(step, std::nullopt).value_or(Mark()).start_s, all.at(i + 1)) << i;
        }
    }
}

TEST_P(MonthPartitionsTest, ACopyHasThemFromTheBeginning) {
    Store::Migrate(url_);
    Store store = Store::Open(url_);
    Events(store).AddAll(std::vector(kMinEventsForPartition, EventAt(kOld)));
    Events(store).AddAll(std::vector(kMinEventsForPartition, EventAt(kFuture)));
    url_ = NewUrl(Engine::kPostgresql, "");
    Store::Migrate(url_);
    Store copy = Store::Open(url_);
    CopyRecords(store, copy, CopySessions::kNo);
    EXPECT_EQ(PartitionOf("events", 1), "events_2020_01");
    EXPECT_EQ(PartitionOf("events", kMinEventsForPartition + 1), "events_default");
}

INSTANTIATE_TEST_SUITE_P(, MonthPartitionsTest, testing::Values(Engine::kPostgresql), EngineName);

}  // namespace
}  // namespace lookhaven::store
