// SPDX-License-Identifier: Apache-2.0
//
// The recorder's side of the event rows: it takes rows in at any time and stores them when it can.
//
// Why so        A store that is away or hangs must not cost a frame. So rows wait here, the newest state of each, and ids
//               for events to come are kept in reserve.
// Invariants    (1) A row is stored after its file exists: whoever puts it says so by putting it.
//               (2) No row is lost while the recorder lives. When it dies, upkeep/recovery.h finds the files.
// Thread safety Any thread; nothing here waits for the store.
#pragma once

#include <deque>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "standalone/recorder/store_thread.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"

namespace lookhaven::recorder {

class EventLedger {
  public:
    // Starts the thread. Throws std::system_error when there is no thread to be had.
    explicit EventLedger(const std::string& store_url);

    // An id for an event that begins now; nothing when the store was away for too long.
    std::optional<int> TakeId();
    bool HasId() const;
    // The row as it shall be from now on; finished when it is no longer recording.
    void Put(const store::Event& row);

    // Stores what changed, looks for marks and fills the reserve for so many cameras, soon.
    void Refresh(std::size_t cameras);

    // The marks whose footage is still to come, as of the last refresh.
    std::vector<store::Mark> PendingMarks() const;
    // Every id from here on was given to this recorder or is not in use yet; nothing before the store was reached.
    std::optional<int> FirstOwnId() const;

    // As StoreThread's; rows that were put before are stored first.
    void RequestStop();
    bool HasEnded() const { return thread_.HasEnded(); }

  private:
    struct Entry {
        store::Event row;
        bool is_stored = false;  // in some state
        bool is_dirty = true;
    };

    void Work(store::Store& store);
    void FillReserve(store::Events& events);
    void StoreRow(store::Events& events, int id);

    mutable std::mutex mutex_;
    std::map<int, Entry> entries_;
    std::deque<int> reserve_;
    std::optional<int> first_own_id_;
    std::size_t wanted_reserve_ = 0;
    std::vector<store::Mark> pending_marks_;
    StoreThread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
