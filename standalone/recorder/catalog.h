// SPDX-License-Identifier: Apache-2.0
//
// The enabled cameras as the store describes them: their streams, how each is recorded, and to which mount.
//
// Why so        Live streams continue while the store is unavailable, so the catalog keeps what it read last. A store
//               that hangs must block nobody, so a thread of its own reads it.
// Thread safety Any thread.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "standalone/recorder/store_thread.h"
#include "standalone/recorder/stream_worker.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::recorder {

// How a camera is recorded.
struct CameraPlan {
    std::string camera_name;
    store::RecordMode mode = store::RecordMode::kNever;
    int segment_s = 300;
    int pre_s = 0;
    int stream = 0;    // the profile that is recorded
    int mount_id = 0;  // 0: there is none to record to
    std::filesystem::path mount;
    std::string installation;                      // whose mounts are recorded to
    int live_profile = 0;                          // the profile that the live view shows, and …
    base::Codec video_type = base::Codec::kMjpeg;  // … what the store says that it sends
    std::string hours = {};                        // as in store::RecordingPlan
    // Where to record while the shared mount of the plan is not mounted here; 0: nowhere.
    int fallback_mount_id = 0;
    std::filesystem::path fallback_mount = {};
};

struct CatalogContents {
    std::map<control::LiveStream, StreamPlan> streams;
    std::map<int, CameraPlan> cameras;  // by id
    std::map<int, OtherHost> hosts;     // the other hosts of the store, by id
    std::map<int, bool> mounts;         // of this host, by id; whether enabled
    bool is_read = false;               // false: the store has not been reached yet
};

class Catalog {
  public:
    // Starts the thread, which reads at once and calls on_change, from that thread, whenever it found something new.
    // Throws std::system_error when no thread can be started.
    // host: as in RecorderLeaseKeeper; the mounts are its own and shared ones.
    Catalog(const std::string& store_url, int host, std::function<void()> on_change);

    // Has the store read again if its revision changed; does not wait.
    void Refresh() { thread_.Ask(); }

    // Has the store say what the camera's live view really is; does not wait.
    void CorrectVideoType(int camera, base::Codec type);

    // What was read last; empty before the first read, never null.
    std::shared_ptr<const CatalogContents> Current() const;

    // As in StoreThread.
    void RequestStop() { thread_.RequestStop(); }
    bool HasEnded() const { return thread_.HasEnded(); }

  private:
    void Read(store::Store& store);
    void WriteVideoTypes(store::Store& store);

    const int host_;
    const std::function<void()> on_change_;
    std::optional<std::int64_t> revision_;  // the thread's alone
    mutable std::mutex mutex_;
    std::map<int, base::Codec> corrections_;  // of the video types, by camera
    std::shared_ptr<const CatalogContents> current_ = std::make_shared<CatalogContents>();
    StoreThread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
