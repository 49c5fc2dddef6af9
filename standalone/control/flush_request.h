// SPDX-License-Identifier: Apache-2.0
//
// Asks the recorder to put an open event on the disk now, so that it can be played up to the present moment.
//
// Why so        The recorder flushes each recording about twice a second; who plays the event just as it happens wants the
//               rest too. Asking goes through a mapped file in the run folder, for neither side may wait long for the
//               other, and either may be killed at any point.
// Invariants    (1) A slot belongs to its asker from the moment it is taken until it is given back or kStaleMs are over.
//               (2) The recorder changes a slot's state only, and only of the very request it has answered.
// Thread safety Any thread and process.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <vector>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/control/demand.h"

namespace lookhaven::control {

class FlushRequests {
  public:
    static constexpr std::size_t kSlots = 64;
    static constexpr std::chrono::milliseconds kLongestWait{2'000};
    static constexpr std::uint32_t kStaleMs = 10'000;

    // Maps the table, which is created when missing. Throws std::system_error when that fails, std::runtime_error when
    // the table is another version's.
    explicit FlushRequests(const base::Installation& installation);

    // For who plays: true once every frame that the recorder had of the event is in its file and index. False when no
    // recorder runs, the event (the recorded event's id) is not being recorded, the disk does not answer within the
    // limit, or a signal came.
    bool Ask(std::int32_t event, std::chrono::milliseconds limit = kLongestWait);

    // For the recorder: the events whose flush is asked for and not answered, each once.
    std::vector<std::int32_t> Pending() const;
    // For the recorder: answers the requests for that event.
    void Answer(std::int32_t event, bool flushed);

  private:
    struct Table;
    Table& Shared() const;

    base::SharedMapping mapping_;
    Demand recorder_;
    CommonConfig* config_;  // null: no recorder ran since the machine started
};

}  // namespace lookhaven::control
