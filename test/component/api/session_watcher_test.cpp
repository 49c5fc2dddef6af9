// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/session_watcher.h"

#include <string>

#include <gtest/gtest.h>

namespace lookhaven::api {
namespace {

TEST(PurgeSchedule, BacksOffWhileTheStoreFailsAndReturnsToItsHour) {
    PurgeSchedule schedule;
    std::string attempts;
    std::int64_t last_s = 0;
    for (std::int64_t now_s = 0; now_s < 25'000; ++now_s) {
        if (schedule.IsDue(now_s)) {
            attempts += std::to_string(now_s - last_s) + " ";
            last_s = now_s;
            const bool is_purged = now_s == 0 || now_s > 12'000;
            schedule.NoteAttempt(now_s, is_purged);
        }
    }
    EXPECT_EQ(attempts, "0 3600 60 120 240 480 960 1920 3600 3600 3600 3600 ");
}

}  // namespace
}  // namespace lookhaven::api
