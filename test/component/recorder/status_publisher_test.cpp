// SPDX-License-Identifier: Apache-2.0
//
// The publisher of a recorder whose disk hangs.
#include "standalone/recorder/status_publisher.h"

#include <chrono>
#include <future>

#include <gtest/gtest.h>

#include "test/support/wait.h"

namespace lookhaven::recorder {
namespace {

TEST(StatusPublisher, HoldsNobodyUpWhileTheDiskHangs) {
    std::promise<void> disk;
    std::vector<std::size_t> written;
    StatusPublisher publisher([&, ready = disk.get_future().share()](const StatusPublisher::States& states) {
        ready.wait();
        written.push_back(states.cameras.size());
    });
    for (const std::size_t cameras : {1U, 1U, 2U, 3U}) {
        publisher.Publish({std::vector<maintenance::CameraStatus>(cameras), {}});
    }
    publisher.RequestStop();
    EXPECT_FALSE(publisher.HasEnded()) << "it waits for the disk in its own thread";
    disk.set_value();
    ASSERT_TRUE(test::Eventually(std::chrono::seconds(30), [&] { return publisher.HasEnded(); }));
    EXPECT_EQ(written.back(), 3U);
}

}  // namespace
}  // namespace lookhaven::recorder
