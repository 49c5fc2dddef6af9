// SPDX-License-Identifier: Apache-2.0
//
// Asks the recorder to flush an open event to disk now, so that it can be played up to the present moment.
//
// Why so        The recorder flushes each recording about twice a second; a viewer who plays the event while it happens
//               needs the rest too. Requests go through a mapped file in the run folder, since neither side may wait
//               long for the other, and either may be killed at any point.
// Invariants    (1) A slot belongs to its requester from the moment it is taken until it is freed or kStaleMs have
//               passed.
//               (2) The recorder changes only a slot's state, and only of the very request that it has answered.
// Thread safety Any thread and process.
#pragma once

#include <chrono>
#include <cstdint>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/control/demand.h"
#include "standalone/control/mapped_table.h"

namespace lookhaven::control {

class FlushRequests {
  public:
    static constexpr std::size_t kSlots = 64;
    static constexpr std::chrono::milliseconds kMaxWait{2'000};
    static constexpr std::uint32_t kStaleMs = 10'000;

    // Maps the table, which is created when missing. Throws std::system_error when that fails, std::runtime_error when
    // the table is another version's.
    explicit FlushRequests(const base::Installation& installation);

    // For players: waits, and is true once every frame that the recorder had of the event (the recorded event's id) is
    // in its file and index. False when no recorder runs, the event is not being recorded, the disk does not answer
    // within the limit, or a signal came.
    bool Ask(std::int32_t event, std::chrono::milliseconds limit = kMaxWait);

    // For the recorder: the events whose flush is requested and not answered, each once.
    std::vector<std::int32_t> Pending() const;
    // For the recorder: answers the requests for that event.
    void Answer(std::int32_t event, bool flushed);

  private:
    struct Table;

    MappedTable<Table> table_;
    Demand recorder_;
    CommonConfig* config_;  // null: no recorder ran since the machine started
};

}  // namespace lookhaven::control
