// SPDX-License-Identifier: Apache-2.0
//
// Slows down guessing: five failed logins of one account from one address within a minute bar them for a minute.
#pragma once

#include <cstdint>
#include <string_view>

#include "standalone/store/store.h"

namespace lookhaven::store {

// Use: Enter before the password is checked, Clear after it was right.
//
// Why so        An attempt counts as failed from its start, else a hundred attempts at once would all pass the check
//               before the first of them failed.
class LoginThrottle {
  public:
    // The store must outlive this object.
    explicit LoginThrottle(Store& store) : connection_(store.connection()) {}

    // 0: go on. Otherwise the seconds after which the next attempt may be made; the password must not be checked
    // then. Account and address may hold any bytes; the account need not exist.
    int Enter(std::string_view account, std::string_view address, std::int64_t now_s);
    // What Enter would return; no attempt counts.
    int Wait(std::string_view account, std::string_view address, std::int64_t now_s);

    void Clear(std::string_view account, std::string_view address);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
