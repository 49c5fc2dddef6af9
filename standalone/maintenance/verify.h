// SPDX-License-Identifier: Apache-2.0
//
// Checks that every row has its file, every file its row and every index its frames, and repairs what it can.
//
// Invariants    (1) Without repair nothing is changed.
//               (2) No unknown file is touched, nor anything outside the mounts.
//               (3) Repair leaves a mount alone as soon as its disk fails: only ENOENT and ENOTDIR mean absent.
//               (4) While the store has no event of a mount that holds recordings, repair imports them and removes
//               nothing.
// Thread safety One thread. A recorder may run at the same time: what it is writing is left alone, and so is a finished
//               file whose row it may still hold in memory.
#pragma once

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::maintenance {

struct Fault {
    std::string problem;  // a sentence with a path or an id
    std::string done;     // what repair did; empty when it did or could do nothing
};

struct VerifyReport {
    std::int64_t events = 0;  // rows checked
    std::int64_t frames = 0;  // of their indexes
    std::vector<Fault> faults;
};

// Reads the head of every frame: about a second for five hours of recordings. progress, when given, is called with the
// number of events done and of all events, counted separately for each mount. left_alone: mounts by id that must not be
// touched, and why; each is reported as a fault, but one for which it says nothing, as another host's. host: this
// machine among the hosts of the store. On shared mounts it leaves alone what others of them record, also what one of
// them left open when it crashed. Throws store::StoreError; trouble with one file is reported as a fault.
VerifyReport Verify(store::Store& store, bool repair,
                    const std::function<void(std::size_t, std::size_t)>& progress = {},
                    const std::map<int, std::string>& left_alone = {}, int host = 0);

}  // namespace lookhaven::maintenance
