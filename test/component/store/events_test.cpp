// SPDX-License-Identifier: Apache-2.0
//
// Events: what is asked of the store is what a look at every single one would give.
#include <algorithm>
#include <array>

#include "standalone/store/events.h"
#include "standalone/store/kept_events.h"
#include "test/component/store/random_records.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class EventTest : public RandomRecords {
  protected:
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
        event.kept = Draw(0, 4) == 0;
        event.demo = Draw(0, 4) == 0;
        return event;
    }

    Events events_{store_};
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
        std::erase_if(rows, [](const Event& event) { return event.recording || event.kept; });
        std::ranges::sort(rows, {}, &Event::id);
        EXPECT_EQ(events_.InRecordingOrder(mount, {}, 1000), rows) << mount;
        std::erase_if(rows, [](const Event& row) { return row.camera_id != 2; });
        EXPECT_EQ(events_.InRecordingOrder(mount, {}, 1000, 2), rows) << mount;
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
    event.demo = event.kept = false;
    events_.Begin(event);
    EXPECT_THROW(events_.Begin(event), AlreadyExists);
    EXPECT_THAT(Ids(events_.Open()), ElementsAre(event.id));
    EXPECT_THAT(events_.InRecordingOrder(event.mount_id, {}, 1), IsEmpty()) << "retention leaves an open one alone";
    EXPECT_EQ(events_.BeginDeletion(std::array{event.id}), 0);
    EXPECT_THAT(events_.PendingDeletion(event.mount_id), IsEmpty());
    const auto grown = [&event](int id, std::int64_t length_s) {
        Event grown_event = event;
        grown_event.id = id;
        grown_event.end_s = event.start_s + length_s;
        grown_event.frame_count = 25;
        grown_event.size_bytes = 5'000'000'000;
        return grown_event;
    };
    const int unknown = events_.NextId();
    EXPECT_EQ(events_.Grow(std::array{grown(unknown, 1), grown(event.id, 1), grown(event.id, -1),
                                      grown(event.id, base::kMaxRecordingSeconds + 1)}),
              1);
    store_.connection().Read([&](soci::session& sql) {
        const bool sqlite = GetParam() == Engine::kSqlite;
        std::string setting;
        sql << (sqlite ? "pragma synchronous" : "show synchronous_commit"), soci::into(setting);
        EXPECT_EQ(setting, sqlite ? "2" : "on") << "a power cut may lose growth, no other change";
    });
    EXPECT_EQ(events_.Find(event.id)->end_s, event.start_s + 1);
    EXPECT_EQ(events_.Find(event.id)->size_bytes, 5'000'000'000);
    EXPECT_THROW(events_.Finish(event.id, event.start_s - 1, 25, 1), InvalidRecord);
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
    KeptEvents kept(store_);
    EXPECT_EQ(kept.Keep(std::array{event.id, unknown}, {"first", "guest", 4}), 1);
    EXPECT_EQ(kept.Keep(std::array{event.id}, {"it's theirs", "admin", 5}), 1);
    EXPECT_EQ(kept.Find(event.id), (KeepRecord{"it's theirs", "admin", 5}));
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
    EXPECT_FALSE(events_.Finish(unknown, event.start_s, 1, 1));
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

LOOKHAVEN_ON_BOTH_ENGINES(EventTest);

}  // namespace
}  // namespace lookhaven::store
