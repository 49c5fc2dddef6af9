// SPDX-License-Identifier: Apache-2.0
//
// What viewers and recorder tell each other beside the rings: requests for streams, and the recorder's heartbeat.
#include <chrono>
#include <fstream>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/control/common_config.h"
#include "standalone/control/demand.h"
#include "test/support/folder.h"
#include "test/support/process.h"
#include "test/support/wait.h"

namespace lookhaven::control {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using test::InChild;
using test::KilledChild;
using test::WaitFor;
using testing::ElementsAre;
using testing::IsEmpty;

class DemandTest : public testing::Test {
  protected:
    const test::TemporaryFolder home_;
    const base::Installation installation_{(base::Installation::CreateFolders(home_), home_)};
};
using CommonConfigTest = DemandTest;

TEST_F(DemandTest, RequestsAreSeenByOtherProcessesAndExpire) {
    const Demand recorder(installation_);
    const std::int64_t begin = base::MonotonicMicros();
    EXPECT_EQ(WaitFor(InChild([&] {
                  Demand viewer(installation_);
                  viewer.Request({2, 1});
                  viewer.Request({2147483647, 0});
                  viewer.Request({1, 0});
                  viewer.Request({2, 1});
              })),
              0);
    const std::int64_t now = base::MonotonicMicros();
    const auto all = ElementsAre(LiveStream{1, 0}, LiveStream{2, 1}, LiveStream{2147483647, 0});
    EXPECT_THAT(recorder.ActiveStreams(now, seconds(15)), all);
    EXPECT_THAT(recorder.ActiveStreams(begin + 14'900'000, seconds(15)), all);
    EXPECT_THAT(recorder.ActiveStreams(now + 15'000'001, seconds(15)), IsEmpty());
    EXPECT_THAT(recorder.ActiveStreams(now - 900'000, seconds(15)), all) << "viewers go on while the recorder looks";
    EXPECT_THAT(recorder.ActiveStreams(begin - 1'000'001, seconds(15)), IsEmpty())
        << "requests of an earlier boot lie ahead";
}

TEST_F(DemandTest, ANewRequestWakesTheRecorderAndARepeatedOneDoesNot) {
    Demand recorder(installation_);
    Demand viewer(installation_);
    const auto wait_ms = [&](milliseconds timeout) {
        const std::int64_t begin = base::MonotonicMicros();
        recorder.WaitForDemand(timeout);
        return (base::MonotonicMicros() - begin) / 1000;
    };
    viewer.Request({1, 0});
    EXPECT_LT(wait_ms(seconds(60)), 30'000) << "a request from before the wait";
    std::int64_t first_us = 0;
    std::int64_t repeated_us = 0;
    std::int64_t waited_ms = 0;
    do {  // again where the machine stalled so long that the repeated request was a new one
        first_us = base::MonotonicMicros();
        viewer.Request({1, 0});
        recorder.WaitForDemand(milliseconds(0));
        viewer.Request({1, 0});
        repeated_us = base::MonotonicMicros();
        waited_ms = wait_ms(milliseconds(50));
    } while (repeated_us - first_us > 1'900'000);
    EXPECT_GE(waited_ms, 50);
    std::thread late([&viewer, waiting = ::gettid()] {
        test::Eventually([&] { return test::IsAsleep(waiting); });
        viewer.Request({2, 0});
    });
    EXPECT_LT(wait_ms(seconds(60)), 30'000) << "a request during the wait";
    late.join();
}

TEST_F(DemandTest, AFullTableKeepsTheRequestsThatItHas) {
    Demand demand(installation_);
    constexpr int kSlots = static_cast<int>(Demand::kSlots);
    for (int camera = 1; camera <= kSlots + 10; ++camera) {
        demand.Request({camera, 0});
    }
    const auto active = demand.ActiveStreams(base::MonotonicMicros());
    ASSERT_EQ(active.size(), Demand::kSlots);
    EXPECT_EQ(active.back().camera, kSlots);
}

TEST_F(DemandTest, ATableOfAnotherVersionIsRefused) {
    std::ofstream(installation_.RunFolder() / "live-demand") << "something else";
    EXPECT_THROW(Demand{installation_}, std::runtime_error);
}

TEST_F(CommonConfigTest, IsMissingUntilARecorderMadeItAndThenStaysTheSame) {
    EXPECT_EQ(MapCommonConfig(installation_), nullptr);
    const auto path = installation_.RunFolder() / "common-config";
    for (const char* left_by_others : {"", "short", "made by another version, and longer than the record is, "}) {
        std::string contents = left_by_others;
        contents.resize(contents.size() * 10, 'x');
        std::ofstream(path) << contents;
        EXPECT_EQ(MapCommonConfig(installation_), nullptr) << left_by_others;
    }
    CommonConfigKeeper recorder(installation_);
    CommonConfig* config = MapCommonConfig(installation_);
    ASSERT_NE(config, nullptr);
    EXPECT_TRUE(recorder.Refresh(true));
    EXPECT_EQ(config->paused, 1);
    CommonConfigKeeper restarted(installation_);
    EXPECT_TRUE(restarted.Refresh(false));
    EXPECT_EQ(config->paused, 0) << "a restarted recorder refreshes the record that readers have";
    EXPECT_TRUE(IsRecorderAlive(*config));
    EXPECT_EQ(FindRecorder(installation_), RecorderState::kAlive);
    config->timestamp_sec -= 6;
    EXPECT_FALSE(IsRecorderAlive(*config));
    EXPECT_EQ(FindRecorder(installation_), RecorderState::kHangs);
    KilledChild crashed([&] { CommonConfigKeeper{installation_}; });
    crashed.Kill();
    EXPECT_EQ(FindRecorder(installation_), RecorderState::kNone);
}

TEST_F(CommonConfigTest, ARecordOfAnEarlierBootIsReplacedSinceItsLockMayBeHeldForEver) {
    const auto path = installation_.RunFolder() / "common-config";
    { CommonConfigKeeper recorder(installation_); }
    std::fstream file(path, std::ios::in | std::ios::out | std::ios::binary);
    file.seekp(sizeof(CommonConfig));
    file << std::string(32, '0') << std::flush;
    EXPECT_EQ(MapCommonConfig(installation_), nullptr);
    CommonConfigKeeper recorder(installation_);
    EXPECT_NE(MapCommonConfig(installation_), nullptr);
}

TEST_F(CommonConfigTest, AReaderKilledWithTheLockStopsNobodyAndALivingOneOnlyForASecond) {
    CommonConfigKeeper recorder(installation_);
    CommonConfig* config = MapCommonConfig(installation_);
    ASSERT_NE(config, nullptr);
    KilledChild reader([&] { pthread_mutex_lock(&config->mutex); });
    EXPECT_FALSE(recorder.Refresh(true));
    reader.Kill();
    ASSERT_TRUE(recorder.Refresh(true));
    EXPECT_EQ(pthread_mutex_lock(&config->mutex), 0) << "the lock is whole again";
    EXPECT_EQ(pthread_mutex_lock(&config->mutex), EDEADLK) << "locking twice is reported, not waited for";
    EXPECT_EQ(config->paused, 1);
    pthread_mutex_unlock(&config->mutex);
}

}  // namespace
}  // namespace lookhaven::control
