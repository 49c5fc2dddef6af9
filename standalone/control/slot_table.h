// SPDX-License-Identifier: Apache-2.0
//
// Slots in which request processes report to the host, one each, in memory that all of them share.
//
// Why so        The host cannot open the store (a fork would break the connection), so only a request process knows
//               whose session it serves, and only the host's watcher process knows which sessions have ended.
// Invariants    (1) Only the host takes and frees slots; a free slot belongs to nobody.
//               (2) A session handle is written once per use of a slot, before has_session is set; the call, before
//                   has_call; what a player can do, and the host of a forwarded one, before its key is set.
//               (3) Other requests only store what they request of a player; only the host signals it.
//               (4) What one request stores for another carries the serial of the request that it is meant for, so it
//                   never reaches a later one in the same slot.
//               (5) What a request occupies is noted in its slot alone, so it is given back when the process ends,
//                   however it ends.
//               (6) Each slot has pages of its own, so that a process can give up all others (KeepOnly). Which slots
//                   are taken the host keeps in memory of its own.
// Thread safety Any process. The host never waits for the mutex.
#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/control/shared_mutex.h"

namespace lookhaven::control {

// What is requested of a player's pause.
struct Pause {
    bool on = false;
    int resumed_rate = 0;  // -128 … 127, to be set when the pause ends; 0: none
};

// A request process that plays recordings.
struct Player {
    std::atomic<std::int64_t> started_us;  // monotonic, once its player file is written; 0: no player
    std::atomic<std::int64_t> key;         // the client's; 0: no player, nor about to become one
    bool takes_rate;                       // its progress file carries the rate …
    bool tells_position;                   // … or the position
    bool can_pause;                        // at rate 1 and slower
    int max_players;                       // of its session at the same time
    std::atomic<bool> is_excess;           // newer ones have taken its place: it is to end
    std::atomic<std::uint64_t> pause;      // a Pause with the serial of the request that it is meant for
    std::atomic<bool> paused;              // the host has signalled it
};

// Costly work of which only so much is done at once.
enum class Work : std::uint8_t {
    kNone,
    kSearch,   // may take seconds of a processor
    kProbing,  // of a camera, or an uploaded picture, by a process of its own
    kExport,   // of footage; a search, too, until its answer turns out to be a stream
    kWatch,    // of what is being reported, for as long as the client likes
};

// How many passwords are hashed at once, in 64 MiB each. Requests admitted as a user's leave the rest to log-ins.
struct HashingLimits {
    std::size_t in_all;
    std::size_t of_users;
    std::size_t of_user;
};

enum class QuotaResult { kGranted, kTooManyOfUser, kTooMany };

constexpr std::size_t kSlotBytes = 4096;  // where pages are larger, a few slots share one

struct alignas(kSlotBytes) Slot {
    std::atomic<std::uint64_t> serial;  // grows with each request; 0: free
    std::atomic<std::uint64_t> ended;   // serial of the last request here that must end, since its session, player or
                                        // client is gone
    std::atomic<bool> is_stream;
    std::atomic<bool> has_session;
    std::atomic<pid_t> pid;
    std::atomic<int> user;               // whose request was admitted; 0: none yet
    std::atomic<std::uint64_t> pairing;  // with the host that sent the request, or that it asks; 0: none
    std::atomic<Work> work;
    std::atomic<bool> is_hashing;  // a password, besides its work
    std::array<char, 64> session;
    std::atomic<bool> has_call;
    std::array<char, 64> call;
    std::array<char, 71> account;  // of its session, or its access token
    std::atomic<int> status;       // of the answer, once it is known
    Player player;
    std::atomic<std::int64_t> forwarded_player_key;  // of the player whose stream it forwards; 0: none
    std::atomic<int> player_host_id;                 // the host where that player runs
    std::atomic<int> other_hosts_camera;             // which its client watches live; 0: none

    bool MustEnd() const { return ended == serial; }
};

// One request in its slot; the slot may be free, or serve another one, at any time.
struct RequestRef {
    Slot* slot;
    std::uint64_t serial;

    bool IsOver() const { return slot->serial != serial; }
};

class SlotTable {
  public:
    // Throws std::system_error.
    explicit SlotTable(std::size_t slots);
    SlotTable(const SlotTable&) = delete;
    SlotTable& operator=(const SlotTable&) = delete;
    ~SlotTable();

    // For the host: a slot for a new request, null when no more than that many are free.
    Slot* Take(std::size_t keep_free = 0);
    void Free(Slot& slot);
    // The slot's number, the same in all processes, and back. Throws std::out_of_range.
    std::size_t NumberOf(const Slot& slot) const { return static_cast<std::size_t>(&slot - slots_.data()); }
    Slot& At(std::size_t number) const;

    // For a request process: sets the session of its slot. Throws std::length_error for a handle that is too long.
    static void SetSession(Slot& slot, std::string_view handle);

    // For a request process: what it serves, "VEXO.Event/List", for those who count; only the first 63 bytes are kept.
    static void SetCall(Slot& slot, std::string_view call);
    // For a request process: whose it is; only the first 70 bytes are kept, and neither an account nor a token has more.
    static void SetAccount(Slot& slot, std::string_view account);
    // Visits the slots of running requests. They may end, or change, at any time.
    void VisitRunning(const std::function<void(const Slot&)>& visit) const;

    // For a request process, six ways to occupy something, each in one step among all processes: however many try at
    // once, no more than the limit succeed.
    //
    // The request is the user's from here on. Counted are admitted requests.
    QuotaResult BeginRequest(Slot& slot, int user, std::size_t max_of_user, std::size_t max_in_all);
    // One of its user's searches, until the process ends or its answer turns out to be a stream. False: no room.
    bool BeginSearch(Slot& slot, std::size_t max_of_user);
    // Until EndHashing. False: no room.
    bool BeginHashing(Slot& slot, const HashingLimits& limits);
    static void EndHashing(Slot& slot) { slot.is_hashing = false; }
    // Until the process ends. False: no room.
    bool BeginProbing(Slot& slot, std::size_t max_in_all);
    // One of its user's exports, until the process ends. Unless it is kGranted, nothing is changed.
    QuotaResult BeginExport(Slot& slot, std::size_t max_of_user, std::size_t max_in_all);
    // One of its user's watches, and no search any more, until the process ends. False: no room.
    bool BeginWatch(Slot& slot, std::size_t max_of_user);

    // Changes, and wakes those who sleep on it, after something was reported: what to ask the store for is not said.
    const std::atomic<std::uint32_t>& Reports() const;
    void NoteReport();

    // The sessions of running requests, unless they must end anyway.
    std::set<std::string> Sessions() const;
    // Marks all requests of the session as to end and wakes the host.
    void EndSession(std::string_view handle);
    // The same of pairings with other hosts.
    std::set<std::uint64_t> Pairings() const;
    void EndPairing(std::uint64_t pairing);

    // For a request process: from now on it is a player, and older players of the session may have to end.
    void BeginPlayer(Slot& slot, std::int64_t key);
    // The session's newest player under the key, which may still be opening its recording, but not one that must end.
    std::optional<RequestRef> FindPlayer(std::string_view session, std::int64_t key) const;
    // NoteForwardedPlayer: this request forwards the stream of a player on another host. FindForwardedPlayer: the host
    // of the session's newest such player with this key; 0 if none.
    static void NoteForwardedPlayer(Slot& slot, std::int64_t key, int host);
    int FindForwardedPlayer(std::string_view session, std::int64_t key) const;
    // Whether another request's client watches that camera, which another host has.
    bool IsWatchedByOthers(const Slot& slot, int camera) const;
    // Held by requests while they change more than one thing of a player, whose rate is in its progress file and whose
    // pause is in its slot. Null after a second.
    SharedLock LockPlayers() const;
    // Lets change alter what is requested of the player, in one step, which may call it several times. False when the
    // player's request is over.
    static bool ChangePause(const RequestRef& player, const std::function<void(Pause&)>& change);
    static Pause PauseOf(const Slot& slot) { return UnpackPause(slot.player.pause); }
    std::set<std::string> SessionsWithPlayers() const;
    // The players that must end once the session's player file names that process: all others but the newest, as many
    // as its limit leaves; those that must end anyway do not count. None when the process is not one of the session.
    std::vector<Slot*> ExcessPlayers(std::string_view session, pid_t newest) const;
    // Makes the host look at its players and at the processes that must end.
    void Wake();
    // Marks one request as to end and wakes the host; does nothing when it is over.
    void End(const RequestRef& use);
    // The same without waking the host, for the host.
    static void MarkEnded(const RequestRef& use);

    // For a request process that is about to decode: no other slot can be reached from it any more, nor the host be
    // woken. Only what takes a slot alone may be called then.
    void KeepOnly(const Slot& slot);

    // Readable after Wake, until ClearWake.
    int WakeDescriptor() const { return wake_.Get(); }
    void ClearWake();
    // For a request process that has moved the wake descriptor and closed those that it inherited: closes nothing.
    void SetWakeDescriptor(int descriptor);

  private:
    struct Guard;

    static std::uint64_t PackPause(std::uint64_t serial, const Pause& pause);
    static Pause UnpackPause(std::uint64_t word);

    void EndAll(const std::function<bool(const Slot&)>& is_meant);
    // How many other requests there are that count.
    std::size_t CountOthers(const Slot& slot, const std::function<bool(const Slot&)>& counts) const;

    // Those that have been taken: reading an unused slot would cost each process a page.
    std::span<Slot> Used() const;
    std::size_t SizeBytes() const;

    Guard* guard_;  // makes counting and occupying one step; in memory before the slots
    std::span<Slot> slots_;
    std::vector<bool> is_taken_;  // of the slots; the host's own
    std::uint64_t last_serial_ = 0;
    base::FileDescriptor wake_;
};

// The session that the slot names; empty when none.
std::string_view SessionOf(const Slot& slot);
// What it serves; empty while that is not known, or is no call's name.
std::string_view CallOf(const Slot& slot);
// Whose it is, any bytes; empty where nobody has logged in. For the host, once the process has ended.
std::string_view AccountOf(const Slot& slot);

}  // namespace lookhaven::control
