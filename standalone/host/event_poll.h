// SPDX-License-Identifier: Apache-2.0
//
// What the host's loop waits for: descriptors, each with a kind and a number by which the loop knows it again.
//
// Invariants    A descriptor that is closed by its owner is no longer waited for.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>

#include "standalone/base/file_descriptor.h"
#include "standalone/host/child.h"

namespace lookhaven::host {

enum class Awaited : std::uint32_t { kListener, kSignals, kWake, kWatcher, kConnection, kHangUp, kProcess };

class EventPoll {
  public:
    // Throws std::system_error.
    EventPoll();

    // Waits for those epoll events of a borrowed descriptor, in place of what was awaited of it before. Throws
    // std::system_error.
    void Watch(int descriptor, Awaited kind, std::uint32_t id, std::uint32_t events);

    // Hands each descriptor that is ready to the function; returns after 64 of them at most, on a signal, or when it is
    // due. A descriptor that the function closes may still be handed over once.
    void Wait(Clock::time_point due, const std::function<void(Awaited kind, std::uint32_t id)>& handle) const;

  private:
    base::FileDescriptor poll_;
};

}  // namespace lookhaven::host
