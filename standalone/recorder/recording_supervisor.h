// SPDX-License-Identifier: Apache-2.0
//
// Starts and stops the recording of every camera, and runs the maintenance of the mounts in a thread of its own.
//
// Thread safety One thread; no call waits for a disk or the store.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "standalone/maintenance/clock_watch.h"
#include "standalone/recorder/recording_worker.h"

namespace lookhaven::recorder {

class RecordingSupervisor {
  public:
    // The installation must outlive this object. Throws std::system_error.
    RecordingSupervisor(const base::Installation& installation, std::chrono::milliseconds no_data_limit);

    // Starts, changes and stops workers to match the catalog and the pending marks.
    void Reconcile(const CatalogContents& catalog);
    void DoEverySecond();

    // The streams that must run because they are recorded.
    std::vector<control::LiveStream> NeededStreams() const;
    // Where to push the stream's frames; null when it is not recorded.
    std::shared_ptr<FrameQueue> QueueOf(control::LiveStream stream) const;

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
    void AnswerFlushes();
    void Maintain(store::Store& store);
    void RecoverMounts(store::Store& store, std::int64_t now_s);
    void MarkNewMounts(store::Store& store);
    void DeleteOld(store::Store& store, std::int64_t now_s, bool is_clock_trusted);
    template <class Work>
    void TryOn(const store::Mount& mount, const std::string& purpose, Work&& work);

    const base::Installation& installation_;
    const std::chrono::milliseconds no_data_limit_;
    control::FlushRequests flush_requests_;
    EventRowQueue rows_;
    std::atomic<bool> needs_space_ = true;
    maintenance::ClockWatch clock_watch_;                   // only the maintenance thread uses it
    std::set<int> recovered_mounts_;                        // only the maintenance thread uses it
    std::int64_t next_retention_us_ = 0;                    // likewise
    std::map<std::string, std::string> reported_failures_;  // likewise; by purpose
    StoreThread maintenance_;
    std::map<int, Entry> entries_;
    std::vector<maintenance::RecordingStatus> published_;
    bool stores_last_rows_ = false;
};

}  // namespace lookhaven::recorder
