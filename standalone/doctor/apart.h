// SPDX-License-Identifier: Apache-2.0
//
// Runs what may block for ever, or crash, without its caller doing either.
//
// Why so        A disk or a file system of the network that hangs blocks whoever looks at it, and no signal helps. A
//               request must be answered all the same, and what else was looked at be told.
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
std::vector<JobResult> RunApart(std::span<const Job> jobs, std::chrono::milliseconds limit);

}  // namespace lookhaven::doctor
