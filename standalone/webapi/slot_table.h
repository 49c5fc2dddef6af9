// SPDX-License-Identifier: Apache-2.0
//
// What request processes tell the host about themselves: one slot each, in memory that all of them share.
//
// Why so        The host cannot open the store (a fork would break the connection), so only a request process knows whose
//               session it serves, and only the watcher knows which sessions have ended.
// Invariants    (1) The host alone takes and frees slots; a slot that is free belongs to nobody.
//               (2) A session handle is written once per use of a slot, before has_session says so.
// Thread safety Any process.
#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <set>
#include <span>
#include <string>
#include <string_view>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::webapi {

struct Slot {
    std::atomic<std::uint64_t> serial;  // grows with each request; 0: free
    std::atomic<bool> is_stream;
    std::atomic<bool> has_session;
    std::atomic<bool> has_ended;  // the session is over: the host is to end the process
    std::array<char, 64> session;
};

class SlotTable {
  public:
    // Throws std::system_error.
    explicit SlotTable(std::size_t slots);
    SlotTable(const SlotTable&) = delete;
    SlotTable& operator=(const SlotTable&) = delete;
    ~SlotTable();

    // The host's: a slot for a new request, null when all are taken.
    Slot* Take();
    static void Free(Slot& slot) { slot.serial = 0; }

    // A request process's: names the session of its slot.
    static void SetSession(Slot& slot, std::string_view handle);
    // How many requests of the same session began before this one and still run. Each of two that start at once sees
    // the other, and only the younger counts it.
    std::size_t OlderOfSession(const Slot& slot) const;

    std::set<std::string> Sessions() const;
    // Marks the processes of the session and wakes the host.
    void EndSession(std::string_view handle);

    // Readable once a session has ended, until TakeWake.
    int WakeDescriptor() const { return wake_.Get(); }
    void TakeWake();
    // A request process has closed all but its own descriptors and moved the wake descriptor.
    void SetWakeDescriptor(int descriptor);

  private:
    std::span<Slot> slots_;
    std::uint64_t last_serial_ = 0;
    base::FileDescriptor wake_;
};

// The session that the slot names; empty when none.
std::string_view SessionOf(const Slot& slot);

}  // namespace lookhaven::webapi
