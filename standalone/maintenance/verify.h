// SPDX-License-Identifier: Apache-2.0
//
// Checks that every row has its file, every file its row and every index its frames, and repairs what can be.
//
// Invariants    (1) Without repair nothing is changed.
//               (2) No unknown file is touched, nor anything outside the mounts.
//               (3) While the store knows no event of a mount that holds recordings, repair takes them in and removes
//                   nothing.
// Thread safety One thread. A recorder may run beside: what it writes just now is left alone.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::maintenance {

struct Fault {
    std::string problem;  // a sentence with a path or an id
    std::string done;     // what repair did; empty when nothing was done
};

struct VerifyReport {
    std::int64_t events = 0;  // rows looked at
    std::int64_t frames = 0;  // of their indexes
    std::vector<Fault> faults;
};

// Reads the heads of all frames: takes about a second for five hours of recordings. progress, when given, is told the
// number of events done and to do. Throws store::StoreError; trouble with one file is a fault of its own.
VerifyReport Verify(store::Store& store, bool repair,
                    const std::function<void(std::size_t, std::size_t)>& progress = {});

}  // namespace lookhaven::maintenance
