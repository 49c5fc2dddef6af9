// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/server.h"

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>

#include <sys/epoll.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/control/player_file.h"
#include "standalone/host/signals.h"

namespace lookhaven::host {

namespace {

constexpr std::chrono::seconds kRefusalLinger{1};
constexpr std::chrono::seconds kWatcherRestart{1};
constexpr std::chrono::seconds kSpareRestart{1};
constexpr std::chrono::milliseconds kAcceptAgain{200};

http::Failure Busy(const std::string& message) {
    return {503, message, http::kRetrySoonSeconds};
}

}  // namespace

Server::Server(const base::Installation& installation, Callbacks callbacks, Listener& listener,
               http::RequestCounters& counters, const ServerLimits& limits)
    : callbacks_(std::move(callbacks)),
      limits_(limits),
      counters_(counters),
      slots_(limits.requests),
      processes_(limits.processes, slots_, counters, installation),
      spares_(limits.spare_processes, slots_,
              {.leave_host =
                   [this, host = ::getpid()](int channel) {
                       connections_.clear();
                       return LeaveHost(host, slots_, -1, channel);
                   },
               .prepare = callbacks_.prepare_process,
               .serve = [this](http::Request& request,
                               control::Slot& slot) { callbacks_.serve_request(request, slots_, slot); }}),
      listener_(listener),
      signals_(BlockSignals()) {
    if (!signals_) {
        base::ThrowErrno("cannot set up the host");
    }
    // What the players of a host that was killed have left.
    std::filesystem::remove_all(installation.ProgressFolder());
    control::SweepPlayerFiles();
    poll_.Watch(listener_.Socket(), Awaited::kListener, 0, EPOLLIN);
    poll_.Watch(signals_.Get(), Awaited::kSignals, 0, EPOLLIN);
    poll_.Watch(slots_.WakeDescriptor(), Awaited::kWake, 0, EPOLLIN);
}

void Server::Run() {
    base::NotifyReady();
    while (!ending_ || !processes_.IsEmpty()) {
        poll_.Wait(RunDueTasks(), [this](Awaited kind, std::uint32_t id) { Handle(kind, id); });
    }
    EndWatcher();
}

void Server::Handle(Awaited kind, std::uint32_t id) {
    switch (kind) {
    case Awaited::kListener:
        return Accept();
    case Awaited::kSignals:
        return BeginShutdown();
    case Awaited::kWake:
        slots_.ClearWake();
        processes_.LookAtPlayers();
        return processes_.EndMarked();
    case Awaited::kWatcher:
        base::LogWarning("the session watcher has ended");
        EndWatcher();
        watcher_due_ = ending_ ? Clock::time_point::max() : Clock::now() + kWatcherRestart;
        return;
    case Awaited::kConnection:
        return Read(static_cast<int>(id));
    case Awaited::kHangUp:
        return processes_.HangUp(static_cast<pid_t>(id));
    case Awaited::kProcess:
        return Reap(static_cast<pid_t>(id));
    }
}

void Server::Accept() {
    // Not set non-blocking: the request process gets this very socket. Reading here never waits by MSG_DONTWAIT.
    base::FileDescriptor socket(::accept4(listener_.Socket(), nullptr, nullptr, SOCK_CLOEXEC));
    if (!socket) {
        if (errno == EMFILE || errno == ENFILE || errno == ENOMEM || errno == ENOBUFS) {
            base::LogError("cannot accept a connection: out of memory, or too many open files");
            poll_.Watch(listener_.Socket(), Awaited::kListener, 0, 0);
            accept_due_ = Clock::now() + kAcceptAgain;
        }
        return;
    }
    const int number = socket.Get();
    Connection& connection = connections_[number];
    connection = {std::move(socket), {}, Clock::now() + limits_.read, false};
    poll_.Watch(number, Awaited::kConnection, static_cast<std::uint32_t>(number), EPOLLIN);
    if (connections_.size() > limits_.requests) {
        Refuse(connection, Busy("too many requests are waiting"));
    }
}

void Server::Read(int socket) {
    const auto found = connections_.find(socket);
    if (found == connections_.end()) {
        return;
    }
    Connection& connection = found->second;
    std::array<char, 16 * 1024> bytes;
    const ssize_t got = ::recv(socket, bytes.data(), bytes.size(), MSG_DONTWAIT);
    if (got < 0 && (errno == EAGAIN || errno == EINTR)) {
        return;
    }
    if (got <= 0) {
        connections_.erase(found);
    } else if (!connection.refused) {
        const ScgiParser::State state = connection.parser.Feed({bytes.data(), static_cast<std::size_t>(got)});
        // Processes that are forked here would inherit it.
        ::explicit_bzero(bytes.data(), static_cast<std::size_t>(got));
        switch (state) {
        case ScgiParser::State::kIncomplete:
            return;
        case ScgiParser::State::kMalformed:
            return Refuse(connection, {400, std::string(connection.parser.Problem())});
        case ScgiParser::State::kComplete:
            Connection complete = std::move(connection);
            connections_.erase(found);
            return StartRequest(std::move(complete));
        }
    }
}

// The connection stays open for a moment and its further bytes are dropped: closing at once would reset it, and the
// client might lose the answer.
void Server::Refuse(Connection& connection, const http::Failure& failure) {
    counters_.NoteRefused(failure.Status());
    const std::string answer = http::FailureAnswer(failure);
    ::send(connection.socket.Get(), answer.data(), answer.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
    ::shutdown(connection.socket.Get(), SHUT_WR);
    connection.refused = true;
    connection.until = Clock::now() + kRefusalLinger;
}

void Server::StartRequest(Connection connection) {
    const int number = connection.socket.Get();
    http::Request request = connection.parser.TakeRequest();
    if (request.unread_body_bytes > 0) {
        if (const std::optional<http::Failure> failure = callbacks_.refuse_unread(request)) {
            request.Wipe();
            return Refuse(connections_[number] = std::move(connection), *failure);
        }
    }
    control::Slot* slot = slots_.Take(callbacks_.is_log_in(request) ? 0 : limits_.kept_for_log_in);
    if (slot == nullptr) {
        request.Wipe();
        return Refuse(connections_[number] = std::move(connection), Busy("too many requests are running"));
    }
    std::optional<Child> child = StartRequestProcess(request, number, *slot);
    std::string address(request.Header("REMOTE_ADDR"));
    request.Wipe();
    if (!child) {
        slots_.Free(*slot);
        return Refuse(connections_[number] = std::move(connection), Busy("cannot start a request process"));
    }
    const pid_t pid = child->pid;
    processes_.Add(*std::move(child), std::move(connection.socket), *slot, std::move(address));
    // Once: the connection stays open, and hung up, until the process is gone.
    poll_.Watch(number, Awaited::kHangUp, static_cast<std::uint32_t>(pid), EPOLLONESHOT);
}

std::optional<Child> Server::StartRequestProcess(http::Request& request, int connection, control::Slot& slot) {
    if (!callbacks_.needs_fork(request)) {
        if (std::optional<Child> spare = spares_.HandOver(request, connection, slot)) {
            spare_due_ = std::min(spare_due_, Clock::now());
            return spare;
        }
    }
    std::optional<Child> child = StartChild("a request process", [&, host = ::getpid()] {
        connections_.clear();  // others' requests, and their descriptors, whose numbers are given anew after this
        LeaveHost(host, slots_, connection);
        callbacks_.serve_request(request, slots_, slot);
    });
    if (child) {
        poll_.Watch(child->process.Get(), Awaited::kProcess, static_cast<std::uint32_t>(child->pid), EPOLLIN);
    }
    return child;
}

void Server::StartSpare() {
    spare_due_ = Clock::time_point::max();
    if (spares_.IsFull()) {
        return;
    }
    const Child* spare = spares_.Start();
    if (spare != nullptr) {
        poll_.Watch(spare->process.Get(), Awaited::kProcess, static_cast<std::uint32_t>(spare->pid), EPOLLIN);
    }
    spare_due_ = Clock::now() + (spare == nullptr ? Clock::duration(kSpareRestart) : Clock::duration(0));
}

void Server::Reap(pid_t pid) {
    if (!processes_.Reap(pid) && spares_.Reap(pid)) {
        spare_due_ = Clock::now() + kSpareRestart;
    }
}

void Server::StartWatcher() {
    watcher_due_ = Clock::time_point::max();
    watcher_ = StartChild("the session watcher", [this, host = ::getpid()] {
        connections_.clear();
        LeaveHost(host, slots_, -1);
        callbacks_.watch_sessions(slots_);
    });
    if (!watcher_) {
        watcher_due_ = Clock::now() + kWatcherRestart;
        return;
    }
    poll_.Watch(watcher_->process.Get(), Awaited::kWatcher, 0, EPOLLIN);
}

void Server::EndWatcher() {
    if (watcher_) {
        ::kill(watcher_->pid, SIGKILL);
        ::waitpid(watcher_->pid, nullptr, 0);
    }
    watcher_.reset();
}

void Server::BeginShutdown() {
    signalfd_siginfo signal{};
    [[maybe_unused]] const ssize_t got = ::read(signals_.Get(), &signal, sizeof signal);
    ending_ = true;
    base::NotifyStopping();
    watcher_due_ = spare_due_ = accept_due_ = Clock::time_point::max();
    spares_.EndAll();
    listener_.Close();
    connections_.clear();
    processes_.EndAll();
}

Clock::time_point Server::RunDueTasks() {
    const Clock::time_point now = Clock::now();
    if (now >= watcher_due_ && !ending_) {
        StartWatcher();
    }
    if (now >= spare_due_ && !ending_) {
        StartSpare();
    }
    if (now >= accept_due_ && !ending_) {
        poll_.Watch(listener_.Socket(), Awaited::kListener, 0, EPOLLIN);
        accept_due_ = Clock::time_point::max();
    }
    if (now >= alive_due_) {
        base::NotifyAlive();
        alive_due_ = now + alive_interval_;
    }
    Clock::time_point next =
        std::min({processes_.SendDueSignals(now), watcher_due_, spare_due_, accept_due_, alive_due_});
    for (auto at = connections_.begin(); at != connections_.end();) {
        Connection& connection = at->second;
        if (now >= connection.until && !connection.refused) {
            Refuse(connection, {408, "the request did not arrive in time"});
        }
        if (now >= connection.until) {
            at = connections_.erase(at);
            continue;
        }
        next = std::min(next, connection.until);
        ++at;
    }
    return next;
}

}  // namespace lookhaven::host
