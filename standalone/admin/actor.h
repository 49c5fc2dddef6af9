// SPDX-License-Identifier: Apache-2.0
//
// Who changes something, and whether they may.
#pragma once

#include <stdexcept>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::admin {

// The actor may not change that; nothing was changed. The text says who may.
class Forbidden : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

struct Actor {
    int user_id = 0;  // 0: the command line, whose user owns the state folder and may do everything
    std::string name = "command line";
    std::string address = {};  // where the request came from; empty for the command line
};

// Throws Forbidden for an account that is no manager, whatever it was when its request was let in. Throws StoreError.
void RequireManager(store::Store& store, const Actor& actor);

}  // namespace lookhaven::admin
