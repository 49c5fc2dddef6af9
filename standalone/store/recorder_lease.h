// SPDX-License-Identifier: Apache-2.0
//
// The recorder's role in the store: only its holder records the store's cameras, whatever hosts share the store.
//
// Why so        Two recorders on one store would record every camera twice. The clocks of two hosts cannot be compared,
//               so the holder counts up, and others take the role over once the count has stood still for a while by
//               their own clock.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::store {

struct RecorderRole {
    std::string holder;      // empty while nobody has had it
    std::int64_t count = 0;  // grows whenever the holder renews it
    int first_own_id = 0;    // event ids from here on may be in the holder's reserve

    friend bool operator==(const RecorderRole&, const RecorderRole&) = default;
};

class RecorderLease {
  public:
    // The store must outlive this object.
    explicit RecorderLease(Store& store) : connection_(store.connection()) {}

    RecorderRole Current();
    // Takes or renews the role if its count is still that one. False when somebody else was faster.
    bool Take(std::int64_t count, const std::string& holder, int first_own_id);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
