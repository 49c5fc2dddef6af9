// SPDX-License-Identifier: Apache-2.0
//
// Slots in which request processes report to the host, one each, in memory that all of them share.
//
// Why so        The host cannot open the store (a fork would break the connection), so only a request process knows
//               whose session it serves, and only the host's watcher process knows which sessions have ended.
// Invariants    (1) Only the host takes and frees slots; a free slot belongs to nobody.
//               (2) A session handle is written once per use of a slot, before has_session is set; what a player can
//                   do, before started_us is set.
//               (3) Other requests only store what they request of a player; only the host signals it.
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
    std::atomic<std::int64_t> started_us;  // monotonic, once its player file is written; 0: no player
    std::atomic<std::int64_t> key;         // the client's
    bool takes_rate;                       // its progress file carries the rate …
    bool tells_position;                   // … or the position
    bool can_pause;                        // at rate 1 and slower
    int max_players;                       // of its session at the same time
    std::atomic<bool> is_excess;           // newer ones have taken its place: it is to end
    std::atomic<bool> pause_requested;
    std::atomic<bool> paused;       // the host has signalled it
    std::atomic<int> resumed_rate;  // to be set when the pause ends; 0: none
};

struct Slot {
    std::atomic<std::uint64_t> serial;  // grows with each request; 0: free
    std::atomic<bool> is_stream;
    std::atomic<bool> has_session;
    std::atomic<bool> must_end;  // session, player or client is gone: the process must end
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

    // For the host: a slot for a new request, null when all are taken.
    Slot* Take();
    static void Free(Slot& slot) { slot.serial = 0; }

    // For a request process: sets the session of its slot. Throws std::length_error for a handle that is too long.
    static void SetSession(Slot& slot, std::string_view handle);
    // How many requests of the slot's session began before it and still run. Of two that start at once, only the
    // younger counts the other.
    std::size_t OlderRequests(const Slot& slot) const;

    // The sessions of running requests, unless they must end anyway.
    std::set<std::string> Sessions() const;
    // Marks all requests of the session as to end and wakes the host.
    void EndSession(std::string_view handle);

    // For a request process: from now on it is a player, and older players of the session may have to end.
    void BeginPlayer(Slot& slot, std::int64_t key);
    // The session's newest player under the key; null when there is none.
    Slot* FindPlayer(std::string_view session, std::int64_t key) const;
    std::set<std::string> SessionsWithPlayers() const;
    // The players that must end once the session's player file names that process: all others but the newest, as many
    // as its limit leaves. None when the process is not one of the session.
    std::vector<Slot*> ExcessPlayers(std::string_view session, pid_t newest) const;
    // Makes the host look at its players and at the processes that must end.
    void Wake();
    // Marks one request as to end and wakes the host.
    void End(Slot& slot);

    // Readable after Wake, until ClearWake.
    int WakeDescriptor() const { return wake_.Get(); }
    void ClearWake();
    // For a request process that has moved the wake descriptor and closed those that it inherited: closes nothing.
    void SetWakeDescriptor(int descriptor);

  private:
    std::span<Slot> slots_;
    std::uint64_t last_serial_ = 0;
    base::FileDescriptor wake_;
};

// The session that the slot names; empty when none.
std::string_view SessionOf(const Slot& slot);

}  // namespace lookhaven::control
