// SPDX-License-Identifier: Apache-2.0
//
// The recording service's common record, which every stream looks at: is the service alive, should streams pause?
//
// Why so        Readers lock the record, and any of them may be killed while it holds the lock: the mutex is robust.
// The
//               record lies in a mapped file that is replaced after a reboot only, since a mutex that was held when the
//               machine lost power would stay locked for ever.
#pragma once

#include <cstdint>
#include <memory>

#include <pthread.h>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"

namespace lookhaven::control {

struct CommonConfig {
    pthread_mutex_t mutex;       // process-shared, robust, error-checking; guards the rest
    std::int64_t timestamp_sec;  // monotonic seconds of the last refresh
    std::uint8_t paused;         // non-zero: streams pause
};

// The recorder's side.
class CommonConfigKeeper {
  public:
    // Makes the record when this boot of the machine has none. Throws std::system_error when that fails.
    explicit CommonConfigKeeper(const base::Installation& installation);

    // Stamps the record with the present time; call it every second. A lock that a dead process held is taken over.
    // False when the lock was not to be had within a second.
    bool Refresh(bool paused);

  private:
    base::SharedMapping mapping_;
};

// The record, mapped until the process ends; null while there is none of this boot and size. Keep the pointer: each
// call maps anew.
CommonConfig* MapCommonConfig(const base::Installation& installation);

// The record was refreshed at most max_age_sec ago.
bool IsRecorderAlive(CommonConfig& config, int max_age_sec = 5);

}  // namespace lookhaven::control
