// SPDX-License-Identifier: Apache-2.0
//
// What the recorder counts of each mount's retention, for monitoring, in a table as counter_table.h describes it.
// Counts begin at 0 when the recorder is started, and where a mount is removed and added again.
#pragma once

#include <cstdint>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/control/counter_table.h"

namespace lookhaven::control {

struct MountCounters {
    int mount = 0;
    std::uint64_t retention_runs = 0;
    std::uint64_t retention_failures = 0;  // out of retention_runs
    std::uint64_t deleted_events = 0;
    std::uint64_t deleted_bytes = 0;
};

// The recorder's side.
class MountCountersWriter {
  public:
    // Puts an empty table in place of an earlier recorder's. One that cannot be made costs nothing but the counts.
    explicit MountCountersWriter(const base::Installation& installation);

    // Replaces what was written before; mounts beyond the 256th are left out.
    void Write(const std::vector<MountCounters>& mounts);

  private:
    struct Table;
    friend std::vector<MountCounters> ReadMountCounters(const base::Installation& installation);

    CounterTableWriter<Table> table_;
};

// What the recorder wrote last; empty when none has run, or one of another version. Check FindRecorder too.
std::vector<MountCounters> ReadMountCounters(const base::Installation& installation);

}  // namespace lookhaven::control
