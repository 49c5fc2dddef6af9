// SPDX-License-Identifier: Apache-2.0
//
// The recordings of all cameras, and the upkeep of what they leave on the mounts.
//
// Thread safety One thread; nothing here waits for a disk or the store.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <vector>

#include "standalone/recorder/recording_worker.h"

namespace lookhaven::recorder {

class Recordings {
  public:
    // The installation must outlive this object. Throws std::system_error.
    Recordings(const base::Installation& installation, std::chrono::milliseconds no_data_limit);

    // Starts, changes and stops recordings as the catalog and the marks ask for.
    void Reconcile(const CatalogContents& catalog);
    void DoEverySecond();

    // The streams that must run to be recorded.
    std::vector<control::LiveStream> Wanted() const;
    // Where the stream's frames go; null when it is not recorded.
    std::shared_ptr<FrameQueue> QueueOf(control::LiveStream stream) const;

    // Asks all threads to end. Rows are stored after the last event is closed, so ask HasEnded until it is true.
    void RequestStop();
    bool HasEnded();

  private:
    struct Entry {
        control::LiveStream stream;
        std::unique_ptr<RecordingWorker> worker;
        bool ends = false;
    };

    std::map<int, std::int64_t> MarkedCameras(const CatalogContents& catalog) const;
    void AnswerFlushes();
    void Care(store::Store& store);

    const base::Installation& installation_;
    const std::chrono::milliseconds no_data_limit_;
    control::FlushRequests flush_requests_;
    EventLedger ledger_;
    std::atomic<bool> room_wanted_ = true;
    bool recovered_ = false;              // the caretaker's alone
    std::int64_t next_retention_us_ = 0;  // likewise
    StoreThread caretaker_;
    std::map<int, Entry> entries_;
    std::vector<maintenance::CameraRecordingState> published_;
    bool stores_last_rows_ = false;
};

}  // namespace lookhaven::recorder
