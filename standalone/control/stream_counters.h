// SPDX-License-Identifier: Apache-2.0
//
// What the recorder counts of each stream that it runs, for monitoring, in a table as counter_table.h describes it.
// Counts begin at 0 with each start of a stream.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/control/counter_table.h"
#include "standalone/control/demand.h"

namespace lookhaven::control {

// Times are monotonic microseconds, 0 for never.
struct StreamCounters {
    LiveStream stream;
    std::uint64_t pictures = 0;
    std::uint64_t bytes = 0;           // of pictures and sound
    double pictures_per_second = 0;    // over the last seconds, as is …
    double bytes_per_second = 0;       // … this
    std::uint64_t connections = 0;     // attempts to reach the camera
    std::int64_t last_picture_us = 0;  // when the stream was started, before there is one

    // These concern its recording, if it is recorded.
    bool is_recorded = false;
    std::uint64_t dropped_pictures = 0;      // because the disk was too slow
    std::uint64_t queued_bytes = 0;          // waiting for the disk
    std::uint64_t queue_capacity_bytes = 0;  // the most that may wait
    std::int64_t written_us = 0;             // up to when what had come is on the disk
    std::int64_t stored_us = 0;              // when the store had the rows of all recordings

    bool operator==(const StreamCounters&) const = default;
};

// The recorder's side.
class StreamCountersWriter {
  public:
    // Puts an empty table in place of an earlier recorder's. One that cannot be made costs nothing but the counts.
    explicit StreamCountersWriter(const base::Installation& installation);

    // Replaces what was written before; streams beyond the 1024th are left out.
    void Write(const std::vector<StreamCounters>& streams);

  private:
    struct Table;
    friend std::optional<std::vector<StreamCounters>> ReadStreamCounters(const base::Installation& installation);

    CounterTableWriter<Table> table_;
};

// What the recorder wrote last; nothing when none has run, or one of another version. A recorder that has ended leaves
// its last numbers behind: check FindRecorder too.
std::optional<std::vector<StreamCounters>> ReadStreamCounters(const base::Installation& installation);

}  // namespace lookhaven::control
