// SPDX-License-Identifier: Apache-2.0
//
// What the recorder counts of each mount's retention, for monitoring: a mapped file, as that of stream_counters.h.
//
// Invariants    (1) A row's numbers may be of two different seconds; each by itself is whole.
//               (2) Counts begin at 0 with each start of the recorder.
#pragma once

#include <cstdint>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/control/mapped_table.h"

namespace lookhaven::control {

struct MountCounters {
    int mount = 0;
    std::uint64_t retention_runs = 0;
    std::uint64_t retention_failures = 0;  // of these
    std::uint64_t deleted_events = 0;
    std::uint64_t deleted_bytes = 0;

    bool operator==(const MountCounters&) const = default;
};

// The recorder's side.
class MountCountersWriter {
  public:
    // Puts an empty table in place of an earlier recorder's. Throws std::system_error.
    explicit MountCountersWriter(const base::Installation& installation);

    // Replaces what was written before; mounts beyond the 256th are left out.
    void Write(const std::vector<MountCounters>& mounts);

  private:
    struct Table;
    friend std::vector<MountCounters> ReadMountCounters(const base::Installation& installation);

    MappedTable<Table> table_;
};

// What the recorder wrote last; empty when none has run, or one of another version. Check FindRecorder too.
std::vector<MountCounters> ReadMountCounters(const base::Installation& installation);

}  // namespace lookhaven::control
