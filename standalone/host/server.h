// SPDX-License-Identifier: Apache-2.0
//
// The host's event loop: accepts requests, starts a process for each, watches connections and processes.
//
// Invariants    (1) Nothing here waits for a client or a process.
//               (2) The store, a ring or libav is never opened in this process: a fork would break it.
// Thread safety One thread, and no other in the process.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>

#include "standalone/base/file_descriptor.h"
#include "standalone/base/installation.h"
#include "standalone/base/service_manager.h"
#include "standalone/control/slot_table.h"
#include "standalone/host/child.h"
#include "standalone/host/event_poll.h"
#include "standalone/host/listener.h"
#include "standalone/host/process_table.h"
#include "standalone/host/scgi.h"
#include "standalone/host/spare_processes.h"
#include "standalone/http/answer.h"
#include "standalone/http/request.h"
#include "standalone/http/request_counters.h"

namespace lookhaven::host {

// What the host calls, given by the program.
struct Callbacks {
    // In a process of its own after LeaveHost, before or after prepare_process: answers the request on standard output.
    std::function<void(http::Request&, control::SlotTable&, control::Slot&)> serve_request;
    // In a process that waits for a request: what most of them need. May take long.
    std::function<void()> prepare_process;
    // In the host: whether the request must see what the host's memory holds now, as the counters.
    std::function<bool(const http::Request&)> needs_fork;
    // In a process of its own after LeaveHost: marks the slots whose session has ended elsewhere, again and again; does
    // not return.
    std::function<void(control::SlotTable&)> watch_sessions;
    // In the host, and must not block: whether it may take a slot that is kept for log-ins.
    std::function<bool(const http::Request&)> is_log_in;
    // In the host, and must not block: why a request with an unread body gets no process; nothing where it does.
    std::function<std::optional<http::Failure>(const http::Request&)> refuse_unread;
};

struct ServerLimits {
    std::size_t requests = 256;              // running at once …
    std::size_t kept_for_log_in = 0;         // … of them
    std::size_t spare_processes = 4;         // started ahead
    std::chrono::milliseconds read{10'000};  // from accepting a connection to the request's last byte
    ProcessLimits processes;
};

class Server {
  public:
    // Borrows the listener, and closes it when it stops to serve, and the counters. Removes what players of a killed
    // host left in the installation's folder of progress files. Blocks all signals of the process. Throws
    // std::system_error.
    Server(const base::Installation& installation, Callbacks callbacks, Listener& listener,
           http::RequestCounters& counters, const ServerLimits& limits);

    // Serves until SIGTERM or SIGINT, then ends the request processes and returns when the last is gone.
    void Run();

  private:
    // A connection whose request has not been read to its end, or whose refusal has not been read.
    struct Connection {
        base::FileDescriptor socket;
        ScgiParser parser;
        Clock::time_point until;
        bool refused = false;
    };

    void Handle(Awaited kind, std::uint32_t id);
    void Accept();
    void Read(int socket);
    void Refuse(Connection& connection, const http::Failure& failure);
    void StartRequest(Connection connection);
    std::optional<Child> StartRequestProcess(http::Request& request, int connection, control::Slot& slot);
    void StartSpare();
    void Reap(pid_t pid);
    void StartWatcher();
    void BeginShutdown();
    void EndWatcher();
    Clock::time_point RunDueTasks();

    const Callbacks callbacks_;
    ServerLimits limits_;
    http::RequestCounters& counters_;
    control::SlotTable slots_;
    ProcessTable processes_;
    SpareProcesses spares_;
    std::map<int, Connection> connections_;
    Listener& listener_;
    EventPoll poll_;
    base::FileDescriptor signals_;
    std::optional<Child> watcher_;
    Clock::time_point watcher_due_ = Clock::time_point::min();  // when to start it
    Clock::time_point spare_due_ = Clock::time_point::min();
    Clock::time_point accept_due_ = Clock::time_point::max();  // when to listen again
    const std::chrono::milliseconds alive_interval_ = base::AliveInterval();
    Clock::time_point alive_due_ = Clock::time_point::min();
    bool ending_ = false;
};

}  // namespace lookhaven::host
