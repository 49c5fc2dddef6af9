// SPDX-License-Identifier: Apache-2.0
//
// What could run: the streams of enabled cameras, how they are recorded, and where to, as the store has it.
//
// Why so        A live stream must outlast the store: while that is away, the catalog keeps what it read last. And a
//               store that hangs must hold up nobody, so a thread of its own reads it.
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
#include <vector>

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
};

struct CatalogContents {
    std::map<control::LiveStream, StreamPlan> streams;
    std::map<int, CameraPlan> cameras;  // by id
};

class Catalog {
  public:
    // Starts the thread, which begins to read at once and calls on_change after it found something new. Throws
    // std::system_error when there is no thread to be had.
    Catalog(const std::string& store_url, std::function<void()> on_change);

    // Asks for the store to be read anew where it says that something changed; does not wait.
    void Refresh() { thread_.Ask(); }

    // What was read last, never null.
    std::shared_ptr<const CatalogContents> Current() const;

    // As StoreThread's.
    void RequestStop() { thread_.RequestStop(); }
    bool HasEnded() const { return thread_.HasEnded(); }

  private:
    void Read(store::Store& store);

    const std::function<void()> on_change_;
    std::optional<std::int64_t> revision_;  // the thread's alone
    mutable std::mutex mutex_;
    std::shared_ptr<const CatalogContents> current_ = std::make_shared<CatalogContents>();
    StoreThread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
