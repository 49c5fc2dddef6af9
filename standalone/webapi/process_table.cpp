// SPDX-License-Identifier: Apache-2.0
#include "standalone/webapi/process_table.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <cstring>
#include <string>

#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/log.h"

namespace lookhaven::webapi {

namespace {

void Signal(const base::FileDescriptor& pidfd, int number) {
    ::syscall(SYS_pidfd_send_signal, pidfd.Get(), number, nullptr, 0);
}

// A player writes its process id into a file named after its session and removes it itself, unless it was killed.
void SweepPlayerFile(std::string_view session, pid_t pid) {
    if (session.empty() || session.find_first_not_of("0123456789abcdef") != session.npos) {
        return;
    }
    const std::string path = "/tmp/player_src.pid." + std::string(session);
    const base::FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    std::array<char, 16> text{};
    const ssize_t length = file ? ::read(file.Get(), text.data(), text.size()) : 0;
    pid_t owner = 0;
    std::from_chars(text.data(), text.data() + std::max<ssize_t>(length, 0), owner);
    if (owner == pid) {
        ::unlink(path.c_str());
    }
}

}  // namespace

std::optional<ProcessTable::Started> ProcessTable::Start(base::FileDescriptor& connection, Slot& slot,
                                                         const std::function<void()>& run) {
    const pid_t pid = ::fork();
    if (pid == 0) {
        run();
        _exit(1);
    }
    base::FileDescriptor pidfd(pid < 0 ? -1 : static_cast<int>(::syscall(SYS_pidfd_open, pid, 0)));
    if (!pidfd) {
        base::LogError(std::string("cannot start a request process: ") + std::strerror(errno));
        if (pid > 0) {
            ::kill(pid, SIGKILL);
            ::waitpid(pid, nullptr, 0);
        }
        return std::nullopt;
    }
    const Started started{pid, pidfd.Get()};
    processes_.insert_or_assign(
        pid, Process{std::move(connection), std::move(pidfd), &slot, Clock::now(), std::nullopt, {}});
    return started;
}

void ProcessTable::HangUp(pid_t pid) {
    if (const auto found = processes_.find(pid); found != processes_.end()) {
        BeginLeaving(found->second);
    }
}

void ProcessTable::LeaveAll() {
    for (auto& [pid, process] : processes_) {
        BeginLeaving(process);
    }
}

void ProcessTable::LeaveEnded() {
    for (auto& [pid, process] : processes_) {
        if (process.slot->has_ended) {
            BeginLeaving(process);
        }
    }
}

void ProcessTable::BeginLeaving(Process& process) {
    if (!process.leaves_since) {
        process.leaves_since = process.next_signal = Clock::now();
    }
}

void ProcessTable::Reap(pid_t pid) {
    const auto found = processes_.find(pid);
    int status = 0;
    if (found == processes_.end() || ::waitpid(pid, &status, WNOHANG) != pid) {
        return;
    }
    if (WIFSIGNALED(status) && WTERMSIG(status) != SIGTERM) {
        base::LogError("request process " + std::to_string(pid) + " died of signal " +
                       std::to_string(WTERMSIG(status)));
    }
    SweepPlayerFile(SessionOf(*found->second.slot), pid);
    SlotTable::Free(*found->second.slot);
    processes_.erase(found);
}

Clock::time_point ProcessTable::SendDueSignals(Clock::time_point now) {
    Clock::time_point next = Clock::time_point::max();
    for (auto& [pid, process] : processes_) {
        const Clock::time_point answer_due = process.began + limits_.answer;
        if (!process.leaves_since && !process.slot->is_stream) {
            if (now < answer_due) {
                next = std::min(next, answer_due);
                continue;
            }
            base::LogError("request process " + std::to_string(pid) + " has not answered in time");
            BeginLeaving(process);
        }
        if (!process.leaves_since) {
            continue;
        }
        if (now >= process.next_signal) {
            Signal(process.pidfd, now - *process.leaves_since >= limits_.leave ? SIGKILL : SIGTERM);
            process.next_signal = now + limits_.repeat;
        }
        next = std::min(next, process.next_signal);
    }
    return next;
}

}  // namespace lookhaven::webapi
