// SPDX-License-Identifier: Apache-2.0
//
// Why the demo cannot be made here.
#pragma once

#include <stdexcept>

namespace lookhaven::demo {

// The installation lacks what the demo is built on; one sentence for the operator. Nothing was changed.
class NotReady : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

}  // namespace lookhaven::demo
