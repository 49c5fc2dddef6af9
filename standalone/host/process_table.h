// SPDX-License-Identifier: Apache-2.0
//
// The running request processes, and how each of them is ended.
//
// Why so        A module's stream tests a flag and then waits: a signal between the two goes unseen. So a process that
//               is to end gets SIGTERM repeatedly, and SIGKILL when it does not end.
// Invariants    (1) Signals go through a pidfd, so never to a process that took over the id.
//               (2) Whatever ends a process, its connection is closed, its slot freed and its files swept.
//               (3) SIGUSR1 is sent to a player only while the player file names another process: one of its session
//                   that plays, unless the player is to end anyway.
// Thread safety One thread.
#pragma once

#include <chrono>
#include <map>
#include <optional>
#include <string>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/base/installation.h"
#include "standalone/control/slot_table.h"
#include "standalone/host/child.h"
#include "standalone/host/request_log.h"
#include "standalone/http/request_counters.h"

namespace lookhaven::host {

struct ProcessLimits {
    std::chrono::milliseconds answer{30'000};  // for a request that turns out not to be a stream
    std::chrono::milliseconds leave{15'000};   // from the first SIGTERM to SIGKILL
    std::chrono::milliseconds repeat{100};     // from one signal to the next
};

class ProcessTable {
  public:
    // Borrows slots and counters.
    ProcessTable(ProcessLimits limits, control::SlotTable& slots, http::RequestCounters& counters,
                 const base::Installation& installation)
        : limits_(limits),
          slots_(slots),
          counters_(counters),
          log_(installation),
          progress_folder_(installation.ProgressFolder()) {}

    // The process serves the connection's request, which came from the address, from now on. When it has ended, call
    // Reap.
    void Add(Child child, base::FileDescriptor connection, control::Slot& slot, std::string address);

    // The process's client is gone: ends the process.
    void HangUp(pid_t pid);
    void EndAll();
    // Those whose session or player has ended.
    void EndMarked();
    // A player is new, or a pause is requested of one: the next SendDueSignals looks at all of them.
    void LookAtPlayers() { players_due_ = Clock::now(); }
    // The process has ended: counts and logs its request, removes the files that it left, and frees its slot. False
    // when it is none of these.
    bool Reap(pid_t pid);

    // Sends what is due; returns when to come again.
    Clock::time_point SendDueSignals(Clock::time_point now);

    bool IsEmpty() const { return processes_.empty(); }

  private:
    struct Process {
        base::FileDescriptor connection;
        base::FileDescriptor pidfd;
        control::Slot* slot = nullptr;
        Clock::time_point began;
        std::optional<Clock::time_point> ending_since;
        Clock::time_point next_signal;
        std::string address;
    };

    static void BeginEnding(Process& process);
    void Count(const Process& process, bool is_crash);
    void Sweep(pid_t pid, const control::Slot& slot) const;
    void SignalPlayers(Clock::time_point now);
    Clock::time_point SignalExcess(Clock::time_point now);
    bool SignalPauses();

    ProcessLimits limits_;
    control::SlotTable& slots_;
    http::RequestCounters& counters_;
    RequestLog log_;
    std::filesystem::path progress_folder_;
    Clock::time_point players_due_ = Clock::time_point::max();
    std::map<pid_t, Process> processes_;
};

}  // namespace lookhaven::host
