// SPDX-License-Identifier: Apache-2.0
//
// Runs jobs that may block for ever or crash, each in a process of its own, so that the caller does neither.
//
// Why so        A disk or network file system that hangs blocks any process that accesses it, and no signal helps. A
//               request must be answered all the same, with the results of the other jobs.
#pragma once

#include <chrono>
#include <functional>
#include <span>
#include <string>
#include <vector>

namespace lookhaven::doctor {

using Job = std::function<std::string()>;

struct JobResult {
    enum class State {
        kDone,
        kLate,    // had not ended in time
        kFailed,  // threw, died, or could not be started
    } state = State::kFailed;
    std::string text = {};  // what the job returned, once it is done
};

// The results in the order of the jobs. These run at the same time, each in a process of its own, which has a copy of
// what the caller has and is killed at the limit, or when the caller ends. The caller must have one thread and no open
// store. Takes hardly longer than the limit, whatever the jobs do.
std::vector<JobResult> RunIsolated(std::span<const Job> jobs, std::chrono::milliseconds limit);

}  // namespace lookhaven::doctor
