// SPDX-License-Identifier: Apache-2.0
//
// What accounts prefer: a text for each, whose form is the caller's. It goes with its account.
#pragma once

#include <functional>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::store {

class Preferences {
  public:
    // The store must outlive this object.
    explicit Preferences(Store& store) : connection_(store.connection()) {}

    // Empty for an account that has none, and for an unknown one.
    std::string Find(int user_id);
    // Replaces the account's text by what change makes of it; no other change comes between the two. change may be
    // called twice. A power cut may lose what was changed last. Throws NotFound for an unknown account, and what
    // change throws.
    void Change(int user_id, const std::function<std::string(const std::string& text)>& change);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
