// SPDX-License-Identifier: Apache-2.0
//
// Event rows on their way to the store, and event ids fetched in advance.
//
// Why so        No frame may be lost because the store is unavailable or hangs. So rows wait here, the newest state of
//               each, and ids for future events are kept in reserve.
// Invariants    (1) A row is stored only after its file exists: a caller puts a row when its file is on the disk.
//               (2) No row is lost while the recorder runs. If it dies, maintenance/recovery.h finds the files.
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

class EventRowQueue {
  public:
    // Starts the thread. Throws std::system_error when no thread can be started.
    explicit EventRowQueue(const std::string& store_url);

    // An id for an event that begins now; nothing when the reserve is used up because the store has been unavailable.
    std::optional<int> TakeId();
    bool HasId() const;
    // Queues the row's newest state, which replaces one that is not stored yet. A row that is no longer recording is
    // final.
    void Put(const store::Event& row);

    // Soon: stores what changed, reads the pending marks and fills the reserve for that many cameras. Does not wait.
    void Refresh(std::size_t cameras);

    // The marks whose footage is still to come, as of the last refresh.
    std::vector<store::Mark> PendingMarks() const;
    // Ids from this one on belong to this recorder or to nobody yet; nothing until the store was reached once.
    std::optional<int> FirstOwnId() const;

    // As in StoreThread; rows already queued are stored first.
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
