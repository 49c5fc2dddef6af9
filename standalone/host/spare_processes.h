// SPDX-License-Identifier: Apache-2.0
//
// Request processes that are started before their request comes, and wait for it.
//
// Why so        To fork, and to touch each page of memory for the first time, takes longer than most requests.
// Invariants    (1) A spare process gets one request, and is a request process like any other from then on.
//               (2) A request never waits for one: where none is ready, its process is forked for it.
// Thread safety One thread, the host's.
#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <optional>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/control/slot_table.h"
#include "standalone/host/child.h"
#include "standalone/http/request.h"

namespace lookhaven::host {

class SpareProcesses {
  public:
    // What a spare process does.
    struct Work {
        // First, in the memory of the host that was forked; given the channel to the host, returns its number from now
        // on. LeaveHost is part of it.
        std::function<int(int channel)> leave_host;
        // Before it waits: what every request needs, once. May take long, or throw, which ends the process.
        std::function<void()> prepare;
        // Answers a request; the connection is standard output.
        std::function<void(http::Request&, control::Slot&)> serve;
    };

    // Starts nothing yet. Borrows the slots.
    SpareProcesses(std::size_t count, control::SlotTable& slots, Work work);
    SpareProcesses(const SpareProcesses&) = delete;
    SpareProcesses& operator=(const SpareProcesses&) = delete;
    ~SpareProcesses() { EndAll(); }

    bool IsFull() const { return spares_.size() >= count_; }
    // Starts one more. Null when that fails; else it is borrowed until this is called again.
    const Child* Start();
    // Gives the request to a spare process that is ready; the caller keeps its connection open. Nothing when none is.
    std::optional<Child> HandOver(const http::Request& request, int connection, const control::Slot& slot);
    // A spare process has ended before it got a request. False when the process is no spare one.
    bool Reap(pid_t pid);
    void EndAll();

  private:
    struct Spare {
        Child child;
        base::FileDescriptor channel;
        bool is_ready = false;
    };

    // name: of a process that serves a request.
    void WaitForRequest(int channel, const char* name) const;
    static void End(const Spare& spare);

    const std::size_t count_;
    control::SlotTable& slots_;
    const Work work_;
    std::deque<Spare> spares_;  // oldest first
};

}  // namespace lookhaven::host
