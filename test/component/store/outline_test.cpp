// SPDX-License-Identifier: Apache-2.0
//
// Outlines: nothing that was recorded is missing, no gap of a step or more is covered, and what is large stands alone.
#include "standalone/store/outline.h"

#include <algorithm>

#include "standalone/store/marks.h"
#include "test/component/store/random_records.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;

constexpr int kEvents = 300;
constexpr std::int64_t kSpan = 100'000;

class OutlineTest : public RandomRecords {
  protected:
    Event RandomEvent() {
        Event event;
        event.camera_id = Draw(1, 2);
        event.mount_id = 1;
        event.start_s = kDay + Draw(0, kSpan);
        event.end_s = event.start_s + (Draw(0, 3) == 0 ? Draw(1, base::kMaxRecordingSeconds) : Draw(1, 200));
        event.reason = Draw(0, 1) == 0 ? base::kReasonContinuous : base::kReasonAlarm;
        event.path = "1/x";
        return event;
    }
};

bool Touches(const Event& event, std::int64_t begin_s, std::int64_t end_s) {
    return event.start_s < end_s && event.end_s > begin_s;
}

// The longest stretch of the bar in which none of the events was recorded, which come by their start.
std::int64_t LongestGap(const Bar& bar, const std::vector<Event>& events) {
    std::int64_t gap = 0;
    std::int64_t covered_s = bar.start_s;
    for (const Event& event : events) {
        if (event.end_s > covered_s && event.start_s < bar.end_s) {
            gap = std::max(gap, event.start_s - covered_s);
            covered_s = event.end_s;
        }
    }
    return std::max(gap, bar.end_s - covered_s);
}

void ExpectDrawn(const std::vector<Bar>& bars, const std::vector<Event>& events, std::int64_t step_s) {
    for (const Event& event : events) {
        const Bar whole{event.start_s, event.end_s};
        EXPECT_TRUE(std::ranges::any_of(
            bars, [&](const Bar& bar) { return bar.start_s <= whole.start_s && bar.end_s >= whole.end_s; }))
            << "missing: " << whole.start_s - kDay;
        if (event.end_s - event.start_s >= 2 * step_s) {
            EXPECT_TRUE(std::ranges::count(bars, whole) > 0) << "large, but not alone: " << whole.start_s - kDay;
        }
    }
    for (const Bar& bar : bars) {
        EXPECT_LT(LongestGap(bar, events), step_s) << bar.start_s - kDay;
    }
    EXPECT_TRUE(std::ranges::is_sorted(bars, {}, &Bar::start_s));
}

TEST_P(OutlineTest, DrawsWhatALookAtEveryEventDraws) {
    std::vector<Event> all(kEvents);
    std::ranges::generate(all, [this] { return RandomEvent(); });
    Events(store_).AddAll(all);
    std::ranges::sort(all, {}, &Event::start_s);
    for (int i = 0; i < 60; ++i) {
        const std::int64_t step_s = std::int64_t{1} << Draw(0, 12);
        const std::int64_t begin_s = kDay + Draw(0, kSpan);
        const std::int64_t end_s = begin_s + Draw(1, kSpan);
        const int camera = Draw(1, 2);
        const Outline outline = OutlineOf(store_, camera, begin_s, end_s, step_s);
        for (const bool continuous : {true, false}) {
            std::vector<Event> shown;
            std::ranges::copy_if(all, std::back_inserter(shown), [&](const Event& event) {
                return event.camera_id == camera && (event.reason == base::kReasonContinuous) == continuous &&
                       Touches(event, begin_s, end_s);
            });
            SCOPED_TRACE(testing::Message() << "step " << step_s << (continuous ? " continuous" : " alarm"));
            ExpectDrawn(continuous ? outline.continuous : outline.alarm, shown, step_s);
        }
    }
}

TEST_P(OutlineTest, NamesOneMarkForEachStep) {
    const int camera = AddCamera();
    const int other = AddCamera();
    Marks marks(store_);
    for (const std::int64_t moment_s : {1000, 1030, 1059, 1060, 5000}) {
        marks.Add(MarkKind::kAlert, camera, moment_s, 0, "");
    }
    marks.Add(MarkKind::kPos, camera, 1001, 0, "");
    marks.Add(MarkKind::kPos, other, 1002, 0, "");
    const Outline outline = OutlineOf(store_, camera, 900, 4000, 60);
    EXPECT_THAT(outline.alerts, ElementsAre(1000, 1060));
    EXPECT_THAT(outline.transactions, ElementsAre(1001));
}

// Ten events a minute for a day cost no more than a few a minute would.
TEST(JoinedBarsTest, AreAsManyAsStepsAtMost) {
    constexpr std::int64_t kStep = 60;
    JoinedBars bars(kStep);
    for (std::int64_t at_s = 0; at_s < 86'400; at_s += 6) {
        bars.Add({at_s, at_s + (at_s % 4000 < 2000 ? 1 : 5)});
    }
    EXPECT_THAT(bars.Take(), ElementsAre(Bar{0, 86'399}));
}

LOOKHAVEN_ON_BOTH_ENGINES(OutlineTest);

}  // namespace
}  // namespace lookhaven::store
