// SPDX-License-Identifier: Apache-2.0
//
// A log line for each request that was answered, while the log level of requests is debug.
//
// Why so        The host writes it, once the request's process has ended: a process that is killed writes nothing.
// Invariants    Neither parameters nor anything else of what was sent is in it but the call's name and the address.
// Thread safety One thread.
#pragma once

#include <chrono>
#include <string_view>

#include "standalone/base/installation.h"
#include "standalone/control/debug_log_config.h"
#include "standalone/control/slot_table.h"

namespace lookhaven::host {

class RequestLog {
  public:
    explicit RequestLog(const base::Installation& installation) : installation_(installation) {}

    // The slot of a process that has ended, and the address of its client. status 0: the process died.
    void Note(const control::Slot& slot, std::string_view address, int status, std::chrono::microseconds took);

  private:
    bool IsOn();

    base::Installation installation_;
    const control::DebugLogConfig* levels_ = nullptr;  // null until there is one
};

}  // namespace lookhaven::host
