// SPDX-License-Identifier: Apache-2.0
//
// Starts and stops the recording of every camera.
//
// Thread safety One thread. No call waits for the store, nor for a disk, except to make a table of counts that could
//               not be made before (control/counter_table.h).
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/control/mount_counters.h"
#include "standalone/control/stream_counters.h"
#include "standalone/recorder/camera_lease_keeper.h"
#include "standalone/recorder/camera_status_tracker.h"
#include "standalone/recorder/mount_supervisor.h"
#include "standalone/recorder/partition_maintenance.h"
#include "standalone/recorder/recording_worker.h"
#include "standalone/recorder/start_attempts.h"
#include "standalone/recorder/status_publisher.h"

namespace lookhaven::recorder {

// How long a host's heartbeat stands still until others take its cameras over.
constexpr std::chrono::milliseconds kHostOfflineLimit{30'000};

class RecordingSupervisor {
  public:
    // host_offline_limit: as in StreamSupervisor. The installation must outlive this object. Throws std::system_error.
    RecordingSupervisor(const base::Installation& installation, std::chrono::milliseconds no_data_limit,
                        std::chrono::milliseconds host_offline_limit = kHostOfflineLimit);

    // Starts, changes and stops workers to match the catalog and the pending marks.
    void Reconcile(const CatalogContents& catalog);
    // signals: of the cameras that are connected to, by id.
    void DoEverySecond(const std::map<int, CameraSignal>& signals);

    // The streams that must run because they are recorded.
    std::vector<control::LiveStream> NeededStreams() const;
    // Adds what concerns the recording of that stream, if it is recorded.
    void AddCounters(control::StreamCounters& counters) const;
    // Where to push the stream's frames; null when it is not recorded.
    std::shared_ptr<FrameQueue> QueueOf(control::LiveStream stream) const;

    // The other host that has the camera's lease; 0 where none has; nothing while that is not known yet.
    std::optional<int> OtherHolder(int camera) const {
        return camera_leases_ ? camera_leases_->OtherHolder(camera) : 0;
    }

    // Asks all threads to end. Rows are stored after the last event is closed, so poll HasEnded until it is true.
    void RequestStop();
    bool HasEnded();

  private:
    struct Entry {
        control::LiveStream stream;
        std::unique_ptr<RecordingWorker> worker;
        bool is_ending = false;
    };

    std::map<int, std::int64_t> MarkedCameras(const CatalogContents& catalog) const;
    void StartRecording(const control::LiveStream& stream);
    void AnswerFlushes();
    bool FootageHasEnded(const store::Mark& mark) const;
    bool IsHeldElsewhere(int camera) const;

    const std::chrono::milliseconds no_data_limit_;
    control::FlushRequests flush_requests_;
    CameraStatusTracker camera_status_;
    control::MountCountersWriter mount_counters_;
    StatusPublisher status_publisher_;
    EventRowQueue rows_;
    std::unique_ptr<CameraLeaseKeeper> camera_leases_;  // null on a single machine
    const std::int64_t started_s_ = base::WallSeconds();
    MountSupervisor mounts_;  // its threads call FootageHasEnded, which uses those above
    StartAttempts starts_;
    std::map<int, Entry> entries_;
    StoreThread missed_marks_;
    PartitionMaintenance partitions_;
    bool stores_last_rows_ = false;
};

}  // namespace lookhaven::recorder
