// SPDX-License-Identifier: Apache-2.0
//
// What request processes tell the host about themselves: one slot each, in memory that all of them share.
//
// Why so        The host cannot open the store (a fork would break the connection), so only a request process knows
//               whose session it serves, and only the watcher knows which sessions have ended.
// Invariants    (1) The host alone takes and frees slots; a slot that is free belongs to nobody.
//               (2) A session handle is written once per use of a slot, before has_session says so; what a player can
//                   do, before since_us says that there is one.
//               (3) Other requests only write down what they want of a player; the host alone signals it.
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
#include <vector>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::control {

// A request process that plays recordings.
struct Player {
    std::atomic<std::int64_t> since_us;  // monotonic: since its player file was written; 0: no player
    std::atomic<std::int64_t> key;       // the client's
    bool takes_rate;                     // its progress file carries the rate …
    bool tells_position;                 // … or the position
    bool can_pause;                      // at rate 1 and slower
    int side_by_side;                    // how many players its session may have
    std::atomic<bool> is_surplus;        // a newer one has taken its place
    std::atomic<bool> pause_wanted;
    std::atomic<bool> paused;       // the host has told it so
    std::atomic<int> resumed_rate;  // to be set when the pause ends; 0: none
};

struct Slot {
    std::atomic<std::uint64_t> serial;  // grows with each request; 0: free
    std::atomic<bool> is_stream;
    std::atomic<bool> has_session;
    std::atomic<bool> has_ended;  // session, player or client is gone: the process is to end
    std::atomic<pid_t> pid;
    std::array<char, 64> session;
    Player player;
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

    // A request process's: from now on its slot is a player's, and older players of the session may have to leave.
    void BeginPlayer(Slot& slot, std::int64_t key);
    // The session's newest player under the key; null when there is none.
    Slot* FindPlayer(std::string_view session, std::int64_t key) const;
    std::set<std::string> SessionsWithPlayers() const;
    // The players that have to leave, now that the session's player file holds that id: all but the newest of them, as
    // many as may play side by side. None when the id is no process of the session.
    std::vector<Slot*> SurplusPlayers(std::string_view session, pid_t holder) const;
    // The host is to look at the players, and at the processes that are to end.
    void Wake();
    void End(Slot& slot);

    // Readable after Wake, until TakeWake.
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

}  // namespace lookhaven::control
