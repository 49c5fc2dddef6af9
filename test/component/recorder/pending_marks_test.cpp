// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/pending_marks.h"

#include <gtest/gtest.h>

namespace lookhaven::recorder {
namespace {

TEST(PendingMarksTest, AMarkThatBecomesKnownLateIsRecordedForSomeSecondsFromThen) {
    constexpr std::int64_t kEnd = 1000;
    const struct {
        std::int64_t known_s, until_s;
    } rows[] = {{kEnd - 20, kEnd},     {kEnd - 4, kEnd},  {kEnd - 1, kEnd + 3}, {kEnd, kEnd + 4},
                {kEnd + 9, kEnd + 13}, {kEnd + 10, kEnd}, {kEnd + 86'400, kEnd}};
    for (const auto& row : rows) {
        store::Mark mark;
        mark.id = 7;
        mark.end_s = kEnd;
        const PendingMarks first = UpdatePendingMarks({mark}, {}, row.known_s);
        EXPECT_EQ(first.at(7).record_until_s, row.until_s) << row.known_s;
        const PendingMarks second = UpdatePendingMarks({mark}, first, row.known_s + 5);
        EXPECT_EQ(second.at(7).record_until_s, row.until_s) << "it is known already";
        EXPECT_TRUE(UpdatePendingMarks({}, second, row.known_s).empty());
    }
}

}  // namespace
}  // namespace lookhaven::recorder
