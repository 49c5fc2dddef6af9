// SPDX-License-Identifier: Apache-2.0
//
// Events and marks: what is asked of the store is what a look at every single one would give.
#include <algorithm>
#include <array>
#include <atomic>
#include <random>

#include "standalone/store/events.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/marks.h"
#include "standalone/store/recording_plans.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t kDay = 4'000'000'000;  // beyond 31 bits
constexpr std::int64_t kNever = std::numeric_limits<std::int64_t>::max();

template <typename Record>
std::vector<int> Ids(const std::vector<Record>& records) {
    std::vector<int> ids;
    std::ranges::transform(records, std::back_inserter(ids), &Record::id);
    return ids;
}

// What a look at every record gives: those that pass, by start and id, then the slice.
template <typename Record, typename Filter, typename Passes>
std::vector<Record> Naive(std::vector<Record> records, const Filter& filter, Passes passes) {
    std::erase_if(records, [&](const Record& record) {
        return !filter.camera_ids.contains(record.camera_id) || record.start_s >= filter.end_s ||
               record.end_s <= filter.begin_s || !passes(record);
    });
    const auto key = [](const Record& record) { return std::pair(record.start_s, record.id); };
    std::ranges::sort(records, {}, key);
    if (filter.newest_first) {
        std::ranges::reverse(records);
    }
    const auto first = std::min(records.size(), static_cast<std::size_t>(filter.offset));
    const auto count = std::min(records.size() - first, static_cast<std::size_t>(filter.limit));
    return {records.begin() + static_cast<std::ptrdiff_t>(first),
            records.begin() + static_cast<std::ptrdiff_t>(first + count)};
}

class EventTest : public StoreTest {
  protected:
    int Draw(int first, int last) { return std::uniform_int_distribution(first, last)(random_); }

    Event RandomEvent() {
        Event event;
        event.camera_id = Draw(1, 5);
        event.mount_id = Draw(1, 3);
        event.start_s = kDay + Draw(0, 40) * 600;  // many start together
        event.end_s = event.start_s + (Draw(0, 9) == 0 ? base::kMaxRecordingSeconds : Draw(0, 1200));
        event.recording = Draw(0, 9) == 0;
        event.reason = Draw(0, 1) == 0 ? base::kReasonContinuous : base::kReasonAlarm;
        event.frame_count = Draw(0, 100'000);
        event.size_bytes = 3'000'000'000LL * Draw(0, 3);
        event.video_type = Draw(0, 1) == 0 ? base::Codec::kMjpeg : base::Codec::kH265;
        event.audio_codec = Draw(0, 1) == 0 ? "" : "aac";
        event.width = Draw(16, 8192);
        event.height = Draw(16, 8192);
        event.path = "1/'x\";--/" + std::to_string(Draw(0, 999));
        event.archived = Draw(0, 4) == 0;
        event.demo = Draw(0, 4) == 0;
        return event;
    }

    template <typename Filter>
    Filter RandomSpan(std::int64_t first_s) {
        Filter filter;
        for (int cameras = Draw(0, 4); cameras > 0; --cameras) {
            filter.camera_ids.insert(Draw(0, 6));
        }
        if (Draw(0, 4) != 0) {
            const std::int64_t begin_s = first_s + Draw(-10, 400) * 60;
            filter.begin_s = Draw(0, 9) == 0 ? -kNever - 1 : begin_s;
            filter.end_s = Draw(0, 9) == 0 ? kNever : begin_s + Draw(-5, 100) * 60;
        }
        filter.newest_first = Draw(0, 2) == 0;
        filter.offset = Draw(0, 2) == 0 ? Draw(0, 20) : 0;
        filter.limit = Draw(0, 1) == 0 ? Draw(0, 20) : filter.limit;
        return filter;
    }

    Step RandomStep(std::int64_t first_s) {
        Step step{RandomSpan<EventFilter>(first_s).camera_ids};
        step.start_s = first_s + Draw(-1, 41) * 600;
        step.id = Draw(0, 400);
        step.backwards = Draw(0, 1) == 0;
        return step;
    }
    // What a look at every record gives.
    template <typename Record, typename Passes>
    static std::optional<Record> NaiveNext(const std::vector<Record>& records, const Step& step, Passes passes) {
        std::optional<Record> next;
        for (const Record& record : records) {
            if (step.camera_ids.contains(record.camera_id) && !record.demo && passes(record) &&
                step.IsNearer(step, record) && (!next || step.IsNearer(record, *next))) {
                next = record;
            }
        }
        return next;
    }

    std::mt19937 random_{19528};
    Events events_{store_};
    Marks marks_{store_};
};

TEST_P(EventTest, SearchFindsWhatALookAtEveryEventFinds) {
    std::vector<Event> all(400);
    std::ranges::generate(all, [this] { return RandomEvent(); });
    events_.AddAll(all);
    std::ranges::for_each(all, [id = 1](Event& event) mutable { event.order = event.id = id++; });
    int found = 0;
    for (int i = 0; i < 300; ++i) {
        auto filter = RandomSpan<EventFilter>(kDay);
        filter.mount_id = Draw(0, 4);
        filter.reason = Draw(0, 2) == 0 ? Draw(1, 3) : 0;
        filter.finished_only = Draw(0, 1) == 0;
        const auto passes = [&](const Event& event) {
            return (filter.mount_id == 0 || event.mount_id == filter.mount_id) &&
                   (filter.reason == 0 || event.reason == filter.reason) && !(filter.finished_only && event.recording);
        };
        const std::vector<Event> expected = Naive(all, filter, passes);
        ASSERT_EQ(events_.List(filter), expected) << i;
        filter.offset = 0;
        filter.limit = std::numeric_limits<int>::max();
        std::vector<Event> visited;
        events_.Visit(filter, [&](const Event& event) { visited.push_back(event); });
        EXPECT_TRUE(std::ranges::is_sorted(visited, {}, &Event::camera_id)) << i;
        ASSERT_THAT(visited, testing::UnorderedElementsAreArray(Naive(all, filter, passes))) << i;
        found += static_cast<int>(expected.size());
    }
    EXPECT_GT(found, 1000) << "the filters let something through";
    found = 0;
    for (int i = 0; i < 300; ++i) {
        const Step step = RandomStep(kDay);
        const auto reasons = static_cast<Reasons>(Draw(0, 2));
        const auto expected = NaiveNext(all, step, [&](const Event& event) {
            return reasons == Reasons::kAny ||
                   (event.reason == base::kReasonContinuous) == (reasons == Reasons::kContinuous);
        });
        ASSERT_EQ(events_.Next(step, reasons), expected) << i;
        found += expected.has_value() ? 1 : 0;
    }
    EXPECT_GT(found, 100);

    for (int mount = 0; mount <= 4; ++mount) {
        std::set<int> cameras;
        std::vector<Event> rows;
        std::int64_t size = 0;
        std::ranges::for_each(all, [&](const Event& event) {
            if (mount == 0 || event.mount_id == mount) {
                cameras.insert(event.camera_id);
            }
            if (event.mount_id == mount && !event.demo) {
                rows.push_back(event);
                size += event.size_bytes;
            }
        });
        EXPECT_EQ(events_.CamerasOn(mount), cameras) << mount;
        EXPECT_EQ(events_.Content(mount).events, std::ssize(rows)) << mount;
        EXPECT_EQ(events_.Content(mount).size_bytes, size) << mount;
        std::vector<Event> visited;
        events_.VisitMount(mount, [&](const Event& event) { visited.push_back(*events_.Find(event.id)); });
        std::ranges::stable_sort(rows, {}, &Event::camera_id);
        EXPECT_EQ(visited, rows) << mount;
        std::erase_if(rows, [](const Event& event) { return event.recording || event.archived; });
        std::ranges::sort(rows, {}, &Event::id);
        EXPECT_EQ(events_.InRecordingOrder(mount, {}, 1000), rows) << mount;
    }
    const auto demo = std::ranges::count_if(all, &Event::demo);
    EXPECT_EQ(events_.RemoveDemo(), demo);
    EXPECT_EQ(std::ssize(events_.List({.camera_ids = {1, 2, 3, 4, 5}})), 400 - demo);
}

TEST_P(EventTest, AnEventGrowsUntilItIsFinished) {
    Event event = RandomEvent();
    event.id = events_.NextId();
    event.end_s = event.start_s;
    event.recording = true;
    event.demo = event.archived = false;
    events_.Begin(event);
    EXPECT_THROW(events_.Begin(event), AlreadyExists);
    EXPECT_THAT(Ids(events_.Open()), ElementsAre(event.id));
    EXPECT_THAT(events_.InRecordingOrder(event.mount_id, {}, 1), IsEmpty()) << "retention leaves an open one alone";
    events_.BeginDeletion(std::array{event.id});
    EXPECT_THAT(events_.PendingDeletion(event.mount_id), IsEmpty());
    EXPECT_TRUE(events_.Grow(event.id, event.start_s + 1, 25, 5'000'000'000));
    store_.connection().Read([&](soci::session& sql) {
        const bool sqlite = GetParam() == Engine::kSqlite;
        std::string setting;
        sql << (sqlite ? "pragma synchronous" : "show synchronous_commit"), soci::into(setting);
        EXPECT_EQ(setting, sqlite ? "2" : "on") << "growing alone may be lost in a power cut, no change after it";
    });
    EXPECT_EQ(events_.Find(event.id)->end_s, event.start_s + 1);
    EXPECT_EQ(events_.Find(event.id)->size_bytes, 5'000'000'000);
    EXPECT_THROW(events_.Grow(event.id, event.start_s - 1, 25, 1), InvalidRecord);
    EXPECT_THROW(events_.Finish(event.id, event.start_s + base::kMaxRecordingSeconds + 1, 25, 1), InvalidRecord);
    EXPECT_TRUE(events_.Finish(event.id, event.start_s + base::kMaxRecordingSeconds, 50, 6));
    EXPECT_THAT(events_.Open(), IsEmpty());
    EXPECT_THAT(Ids(events_.InRecordingOrder(event.mount_id, {}, 1)), ElementsAre(event.id));
    const Event finished = *events_.Find(event.id);
    EXPECT_THAT(events_.InRecordingOrder(event.mount_id, finished, 1), IsEmpty());
    events_.BeginDeletion(std::array{event.id});
    EXPECT_FALSE(events_.Find(event.id) || events_.Content(event.mount_id).events > 0);
    EXPECT_THAT(events_.PendingDeletion(event.mount_id), ElementsAre(finished));
    events_.CancelDeletion(std::array{event.id});
    EXPECT_EQ(events_.Find(event.id), finished);
    const int unknown = events_.NextId();
    KeptEvents kept(store_);
    EXPECT_EQ(kept.Keep(std::array{event.id, unknown}, {"first", "guest", 4}), 1);
    EXPECT_EQ(kept.Keep(std::array{event.id}, {"it's theirs", "admin", 5}), 1);
    EXPECT_EQ(kept.Find(event.id), (Keeping{"it's theirs", "admin", 5}));
    EXPECT_THROW(kept.Keep(std::array{event.id}, {"a\nb", "", 0}), InvalidRecord);
    EXPECT_THAT(events_.InRecordingOrder(event.mount_id, {}, 1), IsEmpty());
    events_.BeginDeletion(std::array{event.id});
    const EventFilter kept_only{.camera_ids = {event.camera_id}, .kept_only = true};
    EXPECT_THAT(Ids(events_.List(kept_only)), ElementsAre(event.id)) << "nothing deletes it";
    EXPECT_EQ(kept.SizeBytes(event.mount_id), 6);
    EXPECT_EQ(kept.Release(std::array{event.id, unknown}), 1);
    EXPECT_THAT(events_.List(kept_only), IsEmpty());
    EXPECT_FALSE(kept.Find(event.id));
    EXPECT_EQ(kept.Keep(std::array{event.id}, {}), 1);
    EXPECT_GT(unknown, event.id);
    EXPECT_FALSE(events_.Grow(unknown, event.start_s, 1, 1) || events_.Finish(unknown, event.start_s, 1, 1));
    EXPECT_EQ(events_.Remove(std::vector{event.id, unknown, event.id}), 1);
    EXPECT_FALSE(events_.Find(event.id) || kept.Find(event.id));
    for (const auto& spoil : std::initializer_list<void (*)(Event&)>{
             [](Event& e) { e.end_s = e.start_s - 1; },
             [](Event& e) { e.end_s = e.start_s + base::kMaxRecordingSeconds + 1; }, [](Event& e) { e.start_s = -5; },
             [](Event& e) { e.camera_id = 0; }, [](Event& e) { e.mount_id = 0; }, [](Event& e) { e.path = "a\nb"; },
             [](Event& e) { e.size_bytes = -1; }}) {
        Event broken = event;
        spoil(broken);
        EXPECT_THROW(events_.Begin(broken), InvalidRecord) << broken.start_s << broken.path;
    }
}

TEST_P(EventTest, AMarkHasTheFootageThatItsCamerasPlanAsksFor) {
    const int camera = AddCamera();
    const Mark alert = marks_.Add(MarkKind::kAlert, camera, kDay / 2, 0, "line one\nzwei");
    EXPECT_EQ(alert.start_s, kDay / 2 - RecordingPlan().pre_s);
    EXPECT_EQ(alert.end_s, kDay / 2 + RecordingPlan().post_s);
    RecordingPlans(store_).Set(camera, {.pre_s = 300, .post_s = 0});
    const Mark pos = marks_.Add(MarkKind::kPos, camera, 100, kMaxMarkSeconds, "");
    EXPECT_EQ(pos.start_s, 0) << "not before 1970";
    EXPECT_EQ(pos.end_s, 100 + kMaxMarkSeconds);

    EXPECT_THAT(Ids(marks_.Pending()), ElementsAre(pos.id, alert.id));
    EXPECT_EQ(marks_.Find(MarkKind::kAlert, alert.id).value(), alert);
    EXPECT_FALSE(marks_.Find(MarkKind::kPos, alert.id)) << "an alert is no POS transaction";
    EXPECT_FALSE(events_.Find(alert.id));
    EXPECT_GT(events_.NextId(), pos.id) << "one counter for both";
    EXPECT_THAT(marks_.EndedBy(camera, kDay, {}, 9), IsEmpty()) << "pending";
    EXPECT_TRUE(marks_.Save(pos.id, 7, "1/a.span"));
    EXPECT_TRUE(marks_.Miss(alert.id));
    EXPECT_THAT(marks_.Pending(), IsEmpty());
    EXPECT_THAT(Ids(marks_.OnMount(7)), ElementsAre(pos.id));
    EXPECT_EQ(marks_.OnMount(7)[0].path, "1/a.span");
    EXPECT_THAT(Ids(marks_.EndedBy(camera, alert.end_s - 1, {}, 9)), ElementsAre(pos.id));
    EXPECT_THAT(Ids(marks_.EndedBy(camera, alert.end_s, {}, 9)), ElementsAre(pos.id, alert.id));
    EXPECT_THAT(Ids(marks_.EndedBy(camera, alert.end_s, pos, 9)), ElementsAre(alert.id));
    EXPECT_TRUE(marks_.Remove(pos.id));
    EXPECT_FALSE(marks_.Remove(pos.id) || marks_.Save(pos.id, 7, "x") || marks_.Miss(pos.id));

    EXPECT_THROW(marks_.Add(MarkKind::kAlert, 99, 100, 0, ""), NotFound);
    const Mark told = marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "till"}, kDay);
    EXPECT_EQ(marks_.Find(MarkKind::kAlert, told.id)->reporter, (Reporter{7, "till"}));
    for (int of = 0; of < 2; ++of) {
        EXPECT_NO_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {}, kDay, 1)) << "nobody's";
    }
    EXPECT_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "till"}, 2 * kDay, 1), TooManyMarks) << "waits";
    EXPECT_TRUE(marks_.Miss(told.id));
    EXPECT_NO_THROW(marks_.Add(MarkKind::kAlert, camera, 100, 0, "", {7, "till"}, 2 * kDay, 1)) << "a day later";
    std::atomic<int> added = 0;
    InParallel(6, [&](Store& store) {
        try {
            Marks(store).Add(MarkKind::kAlert, camera, 100, 0, "", {8, "till"}, kDay, 2);
            ++added;
        } catch (const TooManyMarks&) {
        }
    });
    EXPECT_EQ(added, 2);
    for (const auto& [moment, length] : {std::pair<std::int64_t, std::int64_t>{-1, 0},
                                         {kNever, 0},
                                         {1LL << 31, 0},
                                         {100, -1},
                                         {100, kMaxMarkSeconds + 1},
                                         {100, kNever}}) {
        EXPECT_THROW(marks_.Add(MarkKind::kAlert, camera, moment, length, ""), InvalidRecord) << moment << length;
    }
    for (const std::string& text : kHostileTexts) {
        try {
            const Mark kept = marks_.Add(MarkKind::kPos, camera, 100, 0, text);
            EXPECT_EQ(marks_.Find(MarkKind::kPos, kept.id)->text, text);
        } catch (const InvalidRecord&) {
            EXPECT_TRUE(text.size() > kMaxMarkTextBytes ||
                        std::ranges::any_of(text, [](char c) { return c != '\n' && (c < ' ' || c > '~'); }))
                << text;
        }
    }
}

TEST_P(EventTest, MarksAreFoundAsALookAtEveryMarkFindsThem) {
    std::vector<Mark> all(200);
    std::ranges::generate(all, [this, id = 1]() mutable {
        Mark mark;
        mark.id = id++;
        mark.kind = Draw(0, 1) == 0 ? MarkKind::kAlert : MarkKind::kPos;
        mark.camera_id = Draw(1, 5);
        mark.start_s = kDay / 2 + Draw(0, 40) * 600;
        mark.moment_s = mark.start_s + 5;
        mark.end_s = mark.start_s + (Draw(0, 5) == 0 ? 4200 : Draw(0, 600));
        mark.text = "receipt " + std::to_string(mark.id);
        mark.state = Draw(0, 3) == 0 ? MarkState::kMissed : MarkState::kSaved;
        mark.mount_id = 1;
        return mark;
    });
    marks_.AddAll(all);
    int found = 0;
    for (int i = 0; i < 100; ++i) {
        auto filter = RandomSpan<MarkFilter>(kDay / 2);
        filter.kind = Draw(0, 1) == 0 ? std::nullopt : std::optional(MarkKind::kPos);
        const auto expected =
            Naive(all, filter, [&](const Mark& mark) { return !filter.kind || mark.kind == *filter.kind; });
        ASSERT_EQ(marks_.List(filter), expected) << i;
        const Step step = RandomStep(kDay / 2);
        ASSERT_EQ(marks_.Next(step, filter.kind), NaiveNext(all, step,
                                                            [&](const Mark& mark) {
                                                                return mark.state == MarkState::kSaved &&
                                                                       (!filter.kind || mark.kind == *filter.kind);
                                                            }))
            << i;
        found += static_cast<int>(expected.size());
    }
    EXPECT_GT(found, 200);
}

LOOKHAVEN_ON_BOTH_ENGINES(EventTest);

}  // namespace
}  // namespace lookhaven::store
