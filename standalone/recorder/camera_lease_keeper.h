// SPDX-License-Identifier: Apache-2.0
//
// The cameras that this host records, where several share the store: takes, keeps and gives up their leases.
//
// Why so        Recording must continue everywhere while no host reaches the store, and a host that alone is cut off
//               cannot tell the two apart. So a host keeps what it held when it last reached the store. Once its
//               heartbeat has stood still for long enough, the others take its floating cameras over, and then two
//               record them, until it reaches the store again and learns within two seconds what it has lost: footage
//               twice, whose ids are of each host's own block, rather than none. A camera that is fixed to its host
//               is never recorded twice.
// Invariants    (1) A lease is given up only when the recording has ended and its rows are stored.
//               (2) Nothing is held before the store says so: a new process begins without cameras.
// Thread safety Any thread; nothing here waits for the store.
#pragma once

#include <atomic>
#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <set>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/recorder/assignment.h"
#include "standalone/recorder/camera_rates.h"
#include "standalone/recorder/event_row_queue.h"
#include "standalone/recorder/store_thread.h"

namespace lookhaven::recorder {

class CameraLeaseKeeper {
  public:
    // Starts the thread. offline_us as in HostWatch. rows: holds the lease of this host's recorder. All outlive this
    // object. Throws std::system_error when no thread can be started.
    CameraLeaseKeeper(const base::Installation& installation, const EventRowQueue& rows, std::int64_t offline_us);

    // Call every second: does what is due; does not wait. received: as in CameraRates, of the cameras that are recorded.
    void Ask(store::HostRoom room, const std::map<int, std::uint64_t>& received);

    // The cameras to record, until the next call. One thread.
    std::set<int> Held() const;
    // Another host has its lease, online or offline; also while that is not known yet.
    bool IsHeldElsewhere(int camera) const;
    // That host's id; 0 where no other has the lease; nothing while that is not known yet.
    std::optional<int> OtherHolder(int camera) const;
    // Call once the last Held() was acted upon: the cameras that are still being recorded or written.
    void NoteRecorded(std::set<int> cameras);
    // As in StoreThread.
    void RequestStop() { thread_.RequestStop(); }
    bool HasEnded() const { return thread_.HasEnded(); }

  private:
    void Work(store::Store& store);
    std::vector<AssignedHost> Observe(const std::vector<store::Host>& all);
    void Publish(std::set<int> held);
    std::map<int, std::int64_t> ChangedRates(const std::vector<store::CameraLease>& cameras) const;
    void NoteHolders(const std::vector<store::CameraLease>& cameras);
    bool HasEnded(int camera) const;
    void Report(const std::vector<AssignedHost>& hosts, const std::vector<store::CameraLease>& cameras);

    const base::Installation& installation_;
    const EventRowQueue& rows_;
    const int own_;
    std::atomic<store::HostRoom> room_ = store::HostRoom::kNone;
    std::atomic<std::int64_t> no_room_since_us_ = 0;  // 0: it has some mount, or was not asked yet
    const std::int64_t offline_us_;

    // Only the thread uses these.
    HostWatch watch_;
    std::vector<maintenance::HostStatus> reported_;

    mutable std::mutex mutex_;
    CameraRates rates_;
    std::set<int> held_;
    std::optional<std::map<int, int>> held_elsewhere_;  // by camera, the host
    std::int64_t published_ = 0;                        // times that held_ changed
    mutable std::int64_t seen_ = 0;                     // published_ when Held was called last
    std::set<int> recorded_;
    std::int64_t noted_ = -1;  // the published_ that recorded_ belongs to
    StoreThread thread_;       // last: it uses the others
};

}  // namespace lookhaven::recorder
