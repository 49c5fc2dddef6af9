// SPDX-License-Identifier: Apache-2.0
//
// What a plan by the hour of the week means at a moment, wherever the host stands and whenever its clocks are put on.
#include "standalone/recorder/schedule.h"

#include <cstdlib>
#include <string>

#include <gtest/gtest.h>

#include "standalone/base/local_time.h"

namespace lookhaven::recorder {
namespace {

using store::RecordMode;

class ScheduleTest : public testing::Test {
  protected:
    ~ScheduleTest() override {
        ::unsetenv("TZ");
        ::tzset();
    }
};

TEST_F(ScheduleTest, TheHourIsThatOfTheHostsClockAsItIsSetNow) {
    constexpr const char* kBerlin = "CET-1CEST,M3.5.0,M10.5.0/3";
    constexpr int kSunday = 6 * 24;
    const struct {
        const char* zone;
        std::int64_t time_s;
        int hour;
    } rows[] = {
        {"UTC0", 1'795'996'800, 0},             // 2026-11-30, a Monday
        {"UTC0", 1'795'995'000, kSunday + 23},  // half an hour before
        {kBerlin, 1'795'995'000, 0},            // where Monday has begun
        {"EST5", 1'795'996'800, kSunday + 19},  // where it has not
        {"<+0545>-5:45", 1'795'996'800, 5},     // by other steps than an hour
        {kBerlin, 1'774'745'999, kSunday + 1},  // clocks are put forward: 1:59:59,
        {kBerlin, 1'774'746'000, kSunday + 3},  // then 3:00
        {kBerlin, 1'792'888'200, kSunday + 2},  // and back: 2:30 comes twice
        {kBerlin, 1'792'891'800, kSunday + 2},
        {kBerlin, 1'792'893'600, kSunday + 3},
    };
    for (const auto& row : rows) {
        ::setenv("TZ", row.zone, 1);  // as the operator does while the recorder runs
        EXPECT_EQ(base::LocalHourOfWeek(row.time_s), row.hour) << row.zone << " " << row.time_s;
    }
}

TEST_F(ScheduleTest, APlanIsFollowedHourByHour) {
    ::setenv("TZ", "UTC0", 1);
    constexpr std::int64_t kHour = 3600;
    constexpr std::int64_t kMonday = 1'795'996'800;
    CameraPlan plan;
    plan.mode = RecordMode::kSchedule;
    plan.pre_s = 10;
    plan.hours = "012" + std::string(165, '0');
    const struct {
        const char* what;
        std::int64_t second;
        RecordMode mode;
        int pre_s;
        bool takes_mark;
    } rows[] = {
        {"never", 0, RecordMode::kNever, 0, false},
        {"always", kHour, RecordMode::kAlways, 10, true},
        {"on alarm", 2 * kHour, RecordMode::kNever, 10, true},
        {"to its last second", 3 * kHour - 1, RecordMode::kNever, 10, true},
        {"in the year 1970, before any clock is right", -kMonday, RecordMode::kAlways, 10, true},
        {"never again", 3 * kHour, RecordMode::kNever, 0, false},
        {"soon, so that a first mark has footage from before it", 168 * kHour + kHour - 10, RecordMode::kNever, 10,
         false},
    };
    for (const auto& row : rows) {
        const CameraPlan now = PlanAt(plan, kMonday + row.second);
        EXPECT_EQ(now.mode, row.mode) << row.what;
        EXPECT_EQ(now.pre_s, row.pre_s) << row.what;
        EXPECT_EQ(TakesMarkAt(plan, kMonday + row.second), row.takes_mark) << row.what;
    }
    for (const RecordMode mode : {RecordMode::kNever, RecordMode::kAlways}) {
        plan.mode = mode;
        EXPECT_EQ(PlanAt(plan, kMonday).mode, mode) << "the hours are kept, but not followed";
        EXPECT_TRUE(TakesMarkAt(plan, kMonday));
    }
}

}  // namespace
}  // namespace lookhaven::recorder
