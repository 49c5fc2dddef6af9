// SPDX-License-Identifier: Apache-2.0
//
// Jobs in processes of their own: one that hangs or dies harms neither its caller nor the others, and leaves no
// process.
#include "standalone/doctor/isolated_jobs.h"

#include <array>
#include <stdexcept>
#include <string>

#include <gtest/gtest.h>
#include <poll.h>

#include "standalone/base/file_descriptor.h"
#include "test/support/process.h"

namespace lookhaven::doctor {
namespace {

using enum JobResult::State;
constexpr std::chrono::milliseconds kLimit{5000};

std::string Hang() {
    for (;;) {
        ::pause();
    }
}

// A pipe that ends when the last process is gone that has been made from this one since.
class EndOfProcesses {
  public:
    EndOfProcesses() {
        std::array<int, 2> ends{};
        EXPECT_EQ(::pipe(ends.data()), 0);
        output_ = base::FileDescriptor(ends[0]);
        input_ = base::FileDescriptor(ends[1]);
    }
    bool Comes() {
        input_.Reset();
        pollfd wait{output_.Get(), POLLIN, 0};
        char byte = 0;
        return ::poll(&wait, 1, 10'000) == 1 && ::read(output_.Get(), &byte, 1) == 0;
    }

  private:
    base::FileDescriptor output_;
    base::FileDescriptor input_;
};

TEST(IsolatedJobs, EachJobFailsForItself) {
    const std::string large(3'000'000, 'x');
    const struct {
        const char* name;
        Job job;
        JobResult::State state;
        std::string text;
    } rows[] = {
        {"returns", [] { return std::string("well"); }, kDone, "well"},
        {"returns nothing", [] { return std::string(); }, kDone, ""},
        {"returns much", [&] { return large; }, kDone, large},
        {"returns a NUL", [] { return std::string(2, '\0'); }, kDone, std::string(2, '\0')},
        {"throws", []() -> std::string { throw std::runtime_error("no"); }, kFailed, ""},
        {"dies", [] { return ::raise(SIGKILL), std::string("dead"); }, kFailed, ""},
        {"exits", []() -> std::string { ::_exit(0); }, kFailed, ""},
        {"hangs", Hang, kLate, ""},
    };
    std::vector<Job> jobs;
    for (const auto& row : rows) {
        jobs.push_back(row.job);
    }
    EndOfProcesses end;
    const std::vector<JobResult> results = RunIsolated(jobs, kLimit);
    ASSERT_EQ(results.size(), std::size(rows));
    for (std::size_t i = 0; i < results.size(); ++i) {
        EXPECT_EQ(results[i].state, rows[i].state) << rows[i].name;
        EXPECT_TRUE(results[i].text == rows[i].text) << rows[i].name;
    }
    EXPECT_TRUE(end.Comes()) << "a process is left";
}

TEST(IsolatedJobs, NoneOutlivesItsCaller) {
    EndOfProcesses end;
    const int status = test::WaitFor(test::InChild([] {
        const std::array<Job, 2> jobs = {Hang, [] { return ::kill(::getppid(), SIGKILL), Hang(); }};
        RunIsolated(jobs, std::chrono::hours(1));
    }));
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_TRUE(end.Comes());
}

}  // namespace
}  // namespace lookhaven::doctor
