// SPDX-License-Identifier: Apache-2.0
//
// How many events the demo made, or why it could not make them.
#pragma once

#include <stdexcept>

namespace lookhaven::demo {

struct EventCounts {
    int events = 0;
    int marks = 0;
};

// The installation lacks what the demo needs; one sentence for the operator. Nothing was changed.
class NotReady : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

}  // namespace lookhaven::demo
