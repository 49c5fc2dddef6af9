// SPDX-License-Identifier: Apache-2.0
//
// Which cameras a host takes and gives away, what they send, and which hosts it takes for offline.
#include "standalone/recorder/assignment.h"

#include <map>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/recorder/camera_rates.h"

namespace lookhaven::recorder {
namespace {

using testing::IsEmpty;

constexpr AssignedHost kTakes{0, true, true, true};
constexpr AssignedHost kDrains{0, true, true, false, true};
constexpr AssignedHost kHasNoRoom{0, true, true, false};
constexpr AssignedHost kStopped{0, true, false, false};
constexpr AssignedHost kOffline{0, false, false, false};

// Hosts 1, 2, … in these states.
std::vector<AssignedHost> Hosts(std::vector<AssignedHost> states) {
    for (int id = 0; AssignedHost & state : states) {
        state.id = ++id;
    }
    return states;
}

struct Case {
    const char* name;
    std::vector<AssignedHost> hosts;  // this one is the first
    store::CameraLease camera;
    bool takes = false;
    bool gives = false;
};

TEST(Assignment, ACameraMovesWhenItMustAndSomebodyTakesIt) {
    const Case cases[] = {
        {"free", {kTakes}, {.host_id = 0}, true},
        {"of an unknown host", {kTakes}, {.host_id = 9}, true},
        {"of a host that is offline", {kTakes, kOffline}, {.host_id = 2}, true},
        {"of a host that was stopped a moment ago", {kTakes, kStopped}, {.host_id = 2}},
        {"of another host", {kTakes, kTakes}, {.host_id = 2}},
        {"free and disabled", {kTakes}, {.enabled = false}},
        {"own and disabled", {kTakes}, {.enabled = false, .host_id = 1}, false, true},
        {"own", {kTakes, kTakes}, {.host_id = 1}},
        {"free, and this host drains", {kDrains, kTakes}, {.host_id = 0}},
        {"own, and this host drains", {kDrains, kTakes}, {.host_id = 1}, false, true},
        {"own, and this host has no room for a moment", {kHasNoRoom, kTakes}, {.host_id = 1}},
        {"own, and all drain", {kDrains, kDrains}, {.host_id = 1}},
        {"own, and only a stopped host could take it", {kDrains, kStopped}, {.host_id = 1}},
        {"fixed to this host, and free", {kDrains, kTakes}, {.fixed_host_id = 1}, true},
        {"fixed to this host, of one that runs", {kTakes, kTakes}, {.fixed_host_id = 1, .host_id = 2}},
        {"fixed to this host, of one that is offline", {kTakes, kOffline}, {.fixed_host_id = 1, .host_id = 2}, true},
        {"fixed to another, and free", {kTakes, kOffline}, {.fixed_host_id = 2}},
        {"fixed to another, which is offline and has it", {kTakes, kOffline}, {.fixed_host_id = 2, .host_id = 2}},
        {"own, fixed to another", {kTakes, kDrains}, {.fixed_host_id = 2, .host_id = 1}, false, true},
        {"own, fixed to another that is offline", {kTakes, kOffline}, {.fixed_host_id = 2, .host_id = 1}},
        {"own and fixed, while it drains", {kDrains, kTakes}, {.fixed_host_id = 1, .host_id = 1}},
        {"own, moved to another", {kTakes, kTakes}, {.host_id = 1, .next_host_id = 2}, false, true},
        {"own, moved to one that is offline", {kTakes, kOffline}, {.host_id = 1, .next_host_id = 2}},
        {"moved to another, and free", {kTakes, kTakes}, {.next_host_id = 2}},
        {"moved to one that is offline, and free", {kTakes, kOffline}, {.next_host_id = 2}, true},
    };
    for (Case each : cases) {
        SCOPED_TRACE(each.name);
        each.camera.camera_id = 5;
        const Assignment assignment = Assign(1, Hosts(each.hosts), {each.camera});
        EXPECT_EQ(assignment.take.size(), each.takes ? 1U : 0U);
        EXPECT_EQ(assignment.give.size(), each.gives ? 1U : 0U);
    }
}

constexpr AssignedHost Large(int processors, bool is_full = false) {
    return {0, true, true, true, false, is_full, processors};
}

TEST(Assignment, EachFreeCameraIsTakenByTheOneHostWithTheLeastToDo) {
    const struct {
        const char* name;
        std::vector<AssignedHost> hosts;
        std::vector<std::pair<int, std::int64_t>> cameras;  // the holder, and what it sends; ids from 1
        std::map<int, int> taken;                           // by which host
    } rows[] = {
        {"as many for each",
         {kTakes, kTakes, kTakes, kDrains},
         {{1, 0}, {1, 0}, {0, 0}, {0, 0}, {0, 0}, {0, 0}, {0, 0}, {4, 0}},
         {{3, 2}, {4, 3}, {5, 2}, {6, 3}, {7, 1}}},
        {"as many bytes for each",
         {kTakes, kTakes},
         {{1, 4000}, {2, 1000}, {0, 1000}, {0, 1000}, {0, 1000}, {0, 1000}},
         {{3, 2}, {4, 2}, {5, 2}, {6, 1}}},
        {"what was not measured counts as the others do",
         {kTakes, kTakes},
         {{1, 0}, {2, 100}, {2, 300}, {0, 0}, {0, 0}},
         {{4, 1}, {5, 1}}},
        {"as many for each processor", {Large(4), Large(2)}, {{0, 0}, {0, 0}, {0, 0}}, {{1, 1}, {2, 1}, {3, 2}}},
        {"unless one of them never said how many it has", {Large(16), Large(0)}, {{1, 0}, {0, 0}}, {{2, 2}}},
        {"a full one takes none", {Large(4, true), Large(1)}, {{2, 900}, {0, 900}}, {{2, 2}}},
        {"where all are full they do", {Large(4, true), Large(4, true), kDrains}, {{1, 0}, {0, 0}}, {{2, 2}}},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.name);
        std::vector<store::CameraLease> cameras;
        for (int id = 0; const auto& [holder, bytes] : row.cameras) {
            cameras.push_back({.camera_id = ++id, .host_id = holder, .bytes_per_second = bytes});
        }
        const std::vector<AssignedHost> hosts = Hosts(row.hosts);
        std::map<int, int> taken;
        for (const AssignedHost& host : hosts) {
            for (const store::CameraLease& camera : Assign(host.id, hosts, cameras).take) {
                EXPECT_TRUE(taken.emplace(camera.camera_id, host.id).second) << "by two: " << camera.camera_id;
            }
        }
        EXPECT_EQ(taken, row.taken);
    }
}

TEST(CameraRates, AreThoseOfAWholeMinuteInWhichSomethingCame) {
    CameraRates rates;
    std::int64_t now_us = 0;
    std::uint64_t bytes = 5'000'000;
    const auto pass = [&](int seconds, std::uint64_t each) {
        for (; seconds > 0; --seconds) {
            rates.Note({{7, bytes += each}}, now_us += 1'000'000);
        }
        return rates.BytesPerSecond().contains(7) ? rates.BytesPerSecond().at(7) / 100 : -1;
    };
    EXPECT_EQ(pass(60, 900), -1);
    EXPECT_EQ(pass(1, 900), 9);
    EXPECT_EQ(pass(90, 0), 9) << "it is lost";
    bytes = 0;
    EXPECT_EQ(pass(61, 2000), 20) << "and back, with a count that begins anew";
    rates.Note({}, 0);
    EXPECT_THAT(rates.BytesPerSecond(), IsEmpty());
}

class HostWatchTest : public testing::Test {
  protected:
    void Pass(int seconds, int raised_host = 0) {
        for (; seconds > 0; --seconds) {
            now_us_ += 1'000'000;
            for (store::Host& host : hosts_) {
                host.heartbeat += host.id == raised_host ? 1 : 0;
            }
            watch_.Observe(hosts_, now_us_);
        }
    }

    HostWatch watch_{30'000'000};
    std::vector<store::Host> hosts_{{.id = 1}, {.id = 2}};
    std::int64_t now_us_ = 7'000'000'000;
};

TEST_F(HostWatchTest, AHostIsAwayOnceItsHeartbeatHasStoodStill) {
    Pass(30, 1);
    EXPECT_TRUE(watch_.IsOnline(1) && watch_.IsOnline(2)) << "seen for less than half a minute";
    Pass(1, 1);
    EXPECT_TRUE(watch_.IsOnline(1));
    EXPECT_FALSE(watch_.IsOnline(2) || watch_.IsOnline(3));
    hosts_[1].heartbeat = -5;
    Pass(1, 1);
    EXPECT_TRUE(watch_.IsOnline(2)) << "a store that lost its last seconds has a lower count";
}

TEST_F(HostWatchTest, NobodyIsAwayBecauseTheStoreWas) {
    Pass(25, 1);
    now_us_ += 3'600'000'000;
    Pass(30);
    EXPECT_TRUE(watch_.IsOnline(1) && watch_.IsOnline(2));
    Pass(1);
    EXPECT_FALSE(watch_.IsOnline(1) || watch_.IsOnline(2));
}

}  // namespace
}  // namespace lookhaven::recorder
