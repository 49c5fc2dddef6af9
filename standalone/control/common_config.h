// SPDX-License-Identifier: Apache-2.0
//
// The recorder's heartbeat, the platform's common configuration, which every stream looks at: is the recorder alive,
// should streams pause?
//
// Why so        Readers lock the record, and any of them may be killed while it holds the lock: the mutex is robust.
//               The record lies in a mapped file that is replaced only after a reboot, since a mutex that was held when
//               the machine lost power would stay locked for ever.
#pragma once

#include <cstdint>
#include <optional>

#include <pthread.h>

#include "standalone/base/installation.h"
#include "standalone/base/process.h"
#include "standalone/control/mapped_table.h"

namespace lookhaven::control {

struct CommonConfigFile;

struct CommonConfig {
    pthread_mutex_t mutex;       // process-shared, robust, error-checking; guards the rest
    std::int64_t timestamp_sec;  // monotonic seconds of the last refresh
    std::uint8_t paused;         // non-zero: streams pause
};

// The recorder's side.
class CommonConfigKeeper {
  public:
    // Creates the record if this boot of the machine has none. Throws std::system_error when that fails.
    explicit CommonConfigKeeper(const base::Installation& installation);

    // Says that the recorder is alive; call it every second. The lock of a dead process is taken over. False when the
    // lock could not be taken within a second.
    bool Refresh(bool paused);

  private:
    MappedTable<CommonConfigFile> table_;
};

// The record, mapped until the process ends; null while there is none of this boot. Keep the pointer: each call maps it
// again.
CommonConfig* MapCommonConfig(const base::Installation& installation);
void UnmapCommonConfig(CommonConfig* config);

enum class RecorderState {
    kNone,   // none runs
    kHangs,  // its process is there, but has not refreshed the record for five seconds
    kAlive,
};
RecorderState FindRecorder(const base::Installation& installation);
// Its process; nothing where FindRecorder says that none runs.
std::optional<base::ProcessIdentity> RecorderProcess(const base::Installation& installation);

// The record was refreshed at most max_age_sec ago. May wait a second for the lock, and is false without it.
bool IsRecorderAlive(CommonConfig& config, int max_age_sec = 5);

}  // namespace lookhaven::control
