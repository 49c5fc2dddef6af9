// SPDX-License-Identifier: Apache-2.0
//
// Counting requests whose names and results come from processes that may have been taken over.
#include "standalone/http/request_counters.h"

#include <numeric>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace lookhaven::http {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::Pair;

TEST(RequestCounters, PutsEachRequestInItsBucketAndLeavesStreamsOut) {
    RequestCounters counters;
    for (const auto took : {0us, 1000us, 1001us, 10'000'000us, 10'000'001us}) {
        counters.NoteServed("A.b", 200, false, took);
    }
    counters.NoteServed("A.b", 200, true, 5s);
    const RequestCounters::Call& call = counters.Calls().at("A.b");
    EXPECT_THAT(call.by_status, ElementsAre(Pair(200, 6)));
    const auto& counts = call.durations.counts;
    EXPECT_EQ(counts[0], 2U) << "a bound belongs to its bucket";
    EXPECT_EQ(counts[1], 1U);
    EXPECT_EQ(counts[12], 1U);
    EXPECT_EQ(counts[13], 1U) << "beyond the last bound";
    EXPECT_EQ(std::accumulate(counts.begin(), counts.end(), std::uint64_t{0}), 5U);
    EXPECT_NEAR(call.durations.sum_s, 20.002, 0.001);
}

TEST(RequestCounters, AreNotBlownUpByInventedNamesOrStatuses) {
    RequestCounters counters;
    counters.NoteServed("", -5, false, 0us);
    for (int i = 0; i < 2000; ++i) {
        counters.NoteServed("Name" + std::to_string(i), i, false, 0us);
    }
    EXPECT_EQ(counters.Calls().size(), RequestCounters::kMaxCalls);
    const std::map<int, std::uint64_t>& none = counters.Calls().at("").by_status;
    EXPECT_LE(none.size(), 501U);
    EXPECT_GE(none.at(0), 1U);
}

}  // namespace
}  // namespace lookhaven::http
