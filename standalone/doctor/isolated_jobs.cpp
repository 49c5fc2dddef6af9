// SPDX-License-Identifier: Apache-2.0
#include "standalone/doctor/isolated_jobs.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/base/io.h"

namespace lookhaven::doctor {

namespace {

// What follows a whole text: a job that died has not written it.
constexpr char kEnd = '\0';

[[noreturn]] void RunAndExit(const Job& job, int output, pid_t parent) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != parent) {
        ::_exit(1);
    }
    try {
        const std::string text = job() + kEnd;
        ::_exit(base::WriteAll(output, text.data(), text.size()) ? 0 : 1);
    } catch (...) {
        ::_exit(1);  // told by the text that is missing
    }
}

// A job's process, which is killed and left to the system where it has not ended.
class Child {
  public:
    Child(const Job& job, pid_t parent) {
        std::array<int, 2> ends{};
        if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
            return;
        }
        output_ = base::FileDescriptor(ends[0]);
        const base::FileDescriptor input(ends[1]);
        pid_ = ::fork();
        if (pid_ == 0) {
            RunAndExit(job, input.Get(), parent);
        }
        if (pid_ < 0) {
            output_.Reset();
        }
    }
    Child(Child&& other) noexcept
        : pid_(std::exchange(other.pid_, -1)),
          output_(std::move(other.output_)),
          text_(std::move(other.text_)) {}
    Child& operator=(Child&&) = delete;
    // What hangs in the kernel does not even die, so nobody waits for it.
    ~Child() {
        if (pid_ > 0) {
            ::kill(pid_, SIGKILL);
            ::waitpid(pid_, nullptr, WNOHANG);
        }
    }

    bool IsRunning() const { return static_cast<bool>(output_); }
    int Output() const { return output_.Get(); }

    void Read() {
        std::array<char, 4096> bytes{};
        const ssize_t count = ::read(output_.Get(), bytes.data(), bytes.size());
        if (count > 0) {
            text_.append(bytes.data(), static_cast<std::size_t>(count));
        } else if (count == 0 || errno != EINTR) {
            output_.Reset();
        }
    }

    JobResult Result() && {
        using enum JobResult::State;
        if (text_.empty() || text_.back() != kEnd) {
            return {IsRunning() ? kLate : kFailed};
        }
        text_.pop_back();
        return {kDone, std::move(text_)};
    }

  private:
    pid_t pid_ = -1;
    base::FileDescriptor output_;  // none once it has ended
    std::string text_;
};

// False at the end of time.
bool WaitAndRead(std::vector<Child>& children, std::int64_t until_us) {
    std::vector<pollfd> waits;
    waits.reserve(children.size());
    for (const Child& child : children) {
        waits.push_back({child.Output(), POLLIN, 0});  // ignored where it is none
    }
    const std::int64_t left_ms = (until_us - base::MonotonicMicros() + 999) / 1000;
    if (left_ms <= 0) {
        return false;
    }
    ::poll(waits.data(), waits.size(), static_cast<int>(left_ms));
    for (std::size_t i = 0; i < children.size(); ++i) {
        if (waits[i].revents != 0) {
            children[i].Read();
        }
    }
    return true;
}

}  // namespace

std::vector<JobResult> RunIsolated(std::span<const Job> jobs, std::chrono::milliseconds limit) {
    const std::int64_t until_us = base::MonotonicMicros() + limit.count() * 1000;
    const pid_t parent = ::getpid();
    std::vector<Child> children;
    children.reserve(jobs.size());
    for (const Job& job : jobs) {
        children.emplace_back(job, parent);
    }
    while (std::ranges::any_of(children, &Child::IsRunning) && WaitAndRead(children, until_us)) {
    }
    std::vector<JobResult> results;
    results.reserve(children.size());
    for (Child& child : children) {
        results.push_back(std::move(child).Result());
    }
    return results;
}

}  // namespace lookhaven::doctor
