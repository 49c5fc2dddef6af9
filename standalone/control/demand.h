// SPDX-License-Identifier: Apache-2.0
//
// The live demand table: viewers stamp the streams that they watch, the recorder runs the stamped ones.
//
// Why so        Cameras that nobody watches should cost nothing, and a viewer that is killed must not keep one running:
// so
//               a wish is a stamp that ages. The table is a mapped file, for neither side may wait for the other.
// Thread safety Any thread and process.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <vector>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"

namespace lookhaven::control {

struct LiveStream {
    std::int32_t camera = 0;
    std::int32_t stream = 0;

    auto operator<=>(const LiveStream&) const = default;
};

class Demand {
  public:
    static constexpr std::size_t kSlots = 1024;
    static constexpr std::chrono::seconds kMaxAge{20};  // viewers may be silent for a ten-second pause

    // Maps the table, which is created when missing. Throws std::system_error when that fails.
    explicit Demand(const base::Installation& installation);

    // Says that somebody wants the stream now. Wakes WaitForDemand when nobody did lately. Never waits; a wish that
    // finds the table full of younger ones is lost.
    void Touch(LiveStream stream);

    // The streams stamped at most max_age before now (base::MonotonicMicros), sorted, each once.
    std::vector<LiveStream> ActiveStreams(std::int64_t now_micros, std::chrono::microseconds max_age = kMaxAge) const;

    // Ends the recorder's WaitForDemand: something else wants to be looked at.
    void Wake();

    // Waits until a stream is wanted that was not before the last call, or Wake is called, or the time is over; a signal
    // ends the wait too.
    void WaitForDemand(std::chrono::milliseconds timeout);

  private:
    struct Table;
    Table& Shared() const;

    base::SharedMapping mapping_;
    std::uint32_t seen_ = 0;
};

}  // namespace lookhaven::control
