// SPDX-License-Identifier: Apache-2.0
//
// Event rows on their way to the store, and what is fetched from it in advance: event ids and pending marks.
//
// Why so        No frame may be lost because the store is unavailable or hangs. So rows wait here, the newest state of
//               each, and ids for future events are kept in reserve.
// Invariants    (1) A row is stored only after its file exists: a caller puts a row when its file is on the disk.
//               (2) No row is lost while the recorder runs. If it dies, maintenance/mount_recovery.h finds the files.
// Thread safety Any thread; nothing here waits for the store.
#pragma once

#include <atomic>
#include <deque>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "standalone/recorder/pending_marks.h"
#include "standalone/recorder/recorder_lease_keeper.h"
#include "standalone/recorder/store_thread.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"

namespace lookhaven::recorder {

class EventRowQueue {
  public:
    // Starts the thread. recorder: names this recorder to others on the same store. host, times: as in RecorderLeaseKeeper.
    // Throws std::system_error when no thread can be started.
    explicit EventRowQueue(const std::string& store_url, const std::string& recorder = "this recorder", int host = 0,
                           LeaseTimes times = {});

    // Another recorder records the cameras of this store: no event may begin here, and there are no ids for one.
    bool IsRefused() const { return is_refused_; }

    // An id for an event that begins now; nothing when the reserve is used up because the store has been unavailable.
    std::optional<int> TakeId();
    bool HasId() const;
    // Queues the row's newest state, which replaces one that is not stored yet. A row that is no longer recording is
    // final.
    void Put(const store::Event& row);

    // Soon: stores what changed, reads the pending marks and fills the reserve for that many cameras. Does not wait.
    void Refresh(std::size_t cameras);

    // The camera's recording: every row of a frame captured before until_s (UTC) has been Put; or it has ended.
    void NoteWritten(int camera, std::int64_t until_s);
    void NoteEnded(int camera);
    // Whether a row of the camera has been Put that is not final in the store yet.
    bool HasUnstored(int camera) const;
    // Whether all such rows are in the store; also for a camera that is not recorded.
    bool HasStored(int camera, std::int64_t until_s) const;
    // When all rows that had been Put were in the store, in monotonic microseconds; at first when this queue began.
    std::int64_t StoredUs() const { return stored_us_; }

    // As of the last refresh.
    PendingMarks Pending() const;
    // The pending mark with that id, if any.
    std::optional<PendingMark> FindPendingMark(int id) const;
    // Ids from this one on belong to this recorder or to nobody yet; nothing until the store was reached once.
    std::optional<int> FirstReservedId() const;

    // As in StoreThread; rows already queued are stored first, and the lease is given back.
    void RequestStop();
    bool HasEnded() const { return thread_.HasEnded(); }

  private:
    struct Entry {
        store::Event row;
        bool is_stored = false;  // in some state
        bool is_dirty = true;
    };

    void Work(store::Store& store);
    bool HoldLease(store::Store& store, int first_reserved_id);
    bool RenewLease(store::Store& store);
    void ReleaseLease(store::Store& store);
    void ForgetReserve();
    void FillReserve(store::Store& store);
    void StoreGrowth(store::Events& events, const std::vector<store::Event>& grown);
    bool StoreRow(store::Events& events, int id);

    mutable std::mutex mutex_;
    std::map<int, Entry> entries_;
    std::deque<int> reserve_;
    std::optional<int> first_reserved_id_;
    std::size_t wanted_reserve_ = 0;
    PendingMarks pending_marks_;                   // only the thread changes it
    std::map<int, std::int64_t> written_until_s_;  // of the cameras that are recorded
    std::map<int, std::int64_t> stored_until_s_;   // the same when the rows were stored last, at stored_s_
    std::int64_t stored_s_ = 0;
    std::atomic<std::int64_t> stored_us_;
    const int host_;
    RecorderLeaseKeeper lease_;       // only the thread uses it
    bool is_growth_refused_ = false;  // only the thread uses it
    std::atomic<bool> is_refused_ = false;
    std::atomic<bool> is_stopping_ = false;
    StoreThread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
