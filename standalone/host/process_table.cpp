// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/process_table.h"

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <string>

#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/log.h"
#include "standalone/control/player_file.h"
#include "standalone/control/progress_file.h"

namespace lookhaven::host {

namespace {

constexpr std::chrono::milliseconds kPendingSignal{5};
// A client that seeks closes one stream and opens the next; the end of the one may be seen after the start of the
// other.
constexpr std::chrono::milliseconds kSeek{50};

void Signal(const base::FileDescriptor& pidfd, int number) {
    ::syscall(SYS_pidfd_send_signal, pidfd.Get(), number, nullptr, 0);
}

// Two signals of one kind become one while the first has not been taken yet.
bool IsPending(pid_t pid, int number) {
    std::ifstream status("/proc/" + std::to_string(pid) + "/status");
    for (std::string line; std::getline(status, line);) {
        if (line.starts_with("SigPnd:") || line.starts_with("ShdPnd:")) {
            const auto set = std::strtoull(line.c_str() + line.find(':') + 1, nullptr, 16);
            if ((set >> (number - 1) & 1) != 0) {
                return true;
            }
        }
    }
    return false;
}

// The session's player file names another process: a player that ends unasked would remove the file all the same.
bool IsReplaced(pid_t pid, const control::Slot& slot) {
    const pid_t newest = slot.player.started_us == 0 ? 0 : control::ReadPlayerFile(control::SessionOf(slot));
    return newest > 0 && newest != pid;
}

}  // namespace

void ProcessTable::Add(Child child, base::FileDescriptor connection, control::Slot& slot, std::string address) {
    processes_.insert_or_assign(child.pid, Process{std::move(connection),
                                                   std::move(child.process),
                                                   &slot,
                                                   Clock::now(),
                                                   std::nullopt,
                                                   {},
                                                   std::move(address)});
}

void ProcessTable::HangUp(pid_t pid) {
    if (const auto found = processes_.find(pid); found != processes_.end()) {
        BeginEnding(found->second);
    }
}

void ProcessTable::EndAll() {
    for (auto& [pid, process] : processes_) {
        BeginEnding(process);
    }
}

void ProcessTable::EndMarked() {
    for (auto& [pid, process] : processes_) {
        if (process.slot->MustEnd()) {
            BeginEnding(process);
        }
    }
}

void ProcessTable::BeginEnding(Process& process) {
    if (!process.ending_since) {
        process.ending_since = process.next_signal = Clock::now();
        control::SlotTable::MarkEnded({process.slot, process.slot->serial});
    }
}

bool ProcessTable::Reap(pid_t pid) {
    const auto found = processes_.find(pid);
    if (found == processes_.end()) {
        return false;
    }
    int status = 0;
    if (::waitpid(pid, &status, WNOHANG) != pid) {
        return true;
    }
    const bool is_crash = WIFSIGNALED(status) && WTERMSIG(status) != SIGTERM;
    if (is_crash) {
        base::LogError("request process " + std::to_string(pid) + " died of signal " +
                       std::to_string(WTERMSIG(status)));
    }
    Count(found->second, is_crash);
    Sweep(pid, *found->second.slot);
    slots_.Free(*found->second.slot);
    processes_.erase(found);
    return true;
}

void ProcessTable::Count(const Process& process, bool is_crash) {
    const control::Slot& slot = *process.slot;
    const int status = is_crash ? 0 : slot.status.load();
    const auto took = std::chrono::duration_cast<std::chrono::microseconds>(Clock::now() - process.began);
    counters_.NoteServed(control::CallOf(slot), status, slot.is_stream, took);
    log_.Note(slot, process.address, status, took);
}

void ProcessTable::Sweep(pid_t pid, const control::Slot& slot) const {
    control::SweepPlayerFile(control::SessionOf(slot), pid);
    if (slot.player.started_us != 0) {
        try {
            control::ProgressFile::Sweep(progress_folder_, slot.player.key, control::SessionOf(slot), pid);
        } catch (const std::exception& error) {
            base::LogError(std::string("cannot sweep a progress file: ") + error.what());
        }
    }
}

// Returns when to look again.
Clock::time_point ProcessTable::SignalExcess(Clock::time_point now) {
    Clock::time_point next = Clock::time_point::max();
    for (const std::string& session : slots_.SessionsWithPlayers()) {
        const auto newest = processes_.find(control::ReadPlayerFile(session));
        if (newest == processes_.end() || newest->second.slot->player.started_us == 0) {
            continue;
        }
        const std::chrono::microseconds started(newest->second.slot->player.started_us);
        for (const control::Slot* slot : slots_.ExcessPlayers(session, newest->first)) {
            // Not by the id in the slot, which is the process's to write.
            const auto found = std::ranges::find(processes_, slot, [](const auto& each) { return each.second.slot; });
            if (const auto due = Clock::time_point(started) + kSeek; now < due) {
                next = std::min(next, due);
            } else if (found != processes_.end()) {
                found->second.slot->player.is_excess = true;
                Signal(found->second.pidfd, SIGUSR1);
                next = std::min(next, now + limits_.repeat);
            }
        }
    }
    return next;
}

bool ProcessTable::SignalPauses() {
    bool again = false;
    for (auto& [pid, process] : processes_) {
        control::Player& player = process.slot->player;
        if (player.started_us == 0 || control::SlotTable::PauseOf(*process.slot).on == player.paused) {
            continue;
        }
        if (IsPending(pid, SIGUSR2)) {
            again = true;
            continue;
        }
        Signal(process.pidfd, SIGUSR2);
        player.paused = !player.paused;
    }
    return again;
}

void ProcessTable::SignalPlayers(Clock::time_point now) {
    if (now < players_due_) {
        return;
    }
    players_due_ = SignalExcess(now);
    if (SignalPauses()) {
        players_due_ = now + kPendingSignal;
    }
}

Clock::time_point ProcessTable::SendDueSignals(Clock::time_point now) {
    SignalPlayers(now);
    Clock::time_point next = players_due_;
    for (auto& [pid, process] : processes_) {
        const Clock::time_point answer_due = process.began + limits_.answer;
        if (!process.ending_since && !process.slot->is_stream) {
            if (now < answer_due) {
                next = std::min(next, answer_due);
                continue;
            }
            base::LogError("request process " + std::to_string(pid) + " has not answered in time");
            BeginEnding(process);
        }
        if (!process.ending_since) {
            continue;
        }
        if (now >= process.next_signal) {
            if (IsReplaced(pid, *process.slot)) {
                Signal(process.pidfd, SIGUSR1);
            }
            Signal(process.pidfd, now - *process.ending_since >= limits_.leave ? SIGKILL : SIGTERM);
            process.next_signal = now + limits_.repeat;
        }
        next = std::min(next, process.next_signal);
    }
    return next;
}

}  // namespace lookhaven::host
