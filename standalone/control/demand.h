// SPDX-License-Identifier: Apache-2.0
//
// The live demand table: viewers request the streams that they watch, the recorder runs those requested lately.
//
// Why so        Cameras that nobody watches should cost nothing, and a viewer that is killed must not keep one running:
//               so requests expire, and viewers repeat them. The table is a mapped file, since neither side may wait
//               for the other.
// Thread safety Any thread and process.
#pragma once

#include <chrono>
#include <cstdint>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/control/mapped_table.h"

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

    // Maps the table, which is created when missing. Throws std::system_error when that fails, std::runtime_error when
    // the table is another version's.
    explicit Demand(const base::Installation& installation);

    // A viewer's: asks for the stream until the request expires. Wakes WaitForDemand if nobody has asked for it lately.
    // Never waits; the request is lost when the table is full of other streams' younger ones.
    void Request(LiveStream stream);

    // The streams requested at most max_age before now (base::MonotonicMicros), sorted, each once.
    std::vector<LiveStream> ActiveStreams(std::int64_t now_micros, std::chrono::microseconds max_age = kMaxAge) const;

    // Ends the recorder's WaitForDemand for another reason.
    void Wake();

    // Waits until a stream is newly requested after the last call returned, Wake is called, or the timeout; a signal
    // ends the wait too. One thread per object.
    void WaitForDemand(std::chrono::milliseconds timeout);

  private:
    struct Table;

    MappedTable<Table> table_;
    std::uint32_t seen_;  // of the table's futex word
};

}  // namespace lookhaven::control
