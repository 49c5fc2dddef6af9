// SPDX-License-Identifier: Apache-2.0
//
// The report of a recorder whose disk hangs.
#include "standalone/recorder/recording_report.h"

#include <chrono>
#include <future>

#include <gtest/gtest.h>

#include "test/support/wait.h"

namespace lookhaven::recorder {
namespace {

TEST(RecordingReport, HoldsNobodyUpWhileTheDiskHangs) {
    std::promise<void> disk;
    std::vector<std::size_t> written;
    RecordingReport report([&, ready = disk.get_future().share()](const RecordingReport::States& states) {
        ready.wait();
        written.push_back(states.cameras.size());
    });
    for (const std::size_t cameras : {1U, 1U, 2U, 3U}) {
        report.Publish({std::vector<maintenance::RecordingStatus>(cameras), {}});
    }
    report.RequestStop();
    EXPECT_FALSE(report.HasEnded()) << "it waits for the disk in its own thread";
    disk.set_value();
    ASSERT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return report.HasEnded(); }));
    EXPECT_EQ(written.back(), 3U);
}

}  // namespace
}  // namespace lookhaven::recorder
