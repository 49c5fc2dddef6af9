// SPDX-License-Identifier: Apache-2.0
//
// The first account, made without a session by the holder of the token that this host's owner has printed.
//
// Invariants    (1) At most one token is valid: a new one voids the one before.
//               (2) None is valid, or given out, once there is an account.
//               (3) The store holds the token's digest only.
//               (4) A restart of the machine voids it, and a clock that is set does not lengthen its life.
#pragma once

#include <cstdint>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <string_view>

#include "standalone/base/clock.h"
#include "standalone/base/installation.h"
#include "standalone/store/store.h"
#include "standalone/store/users.h"

namespace lookhaven::admin {

constexpr std::int64_t kSetupTokenLifetimeS = std::int64_t{15} * 60;

// The token is no valid one, or no longer; nothing was changed.
class InvalidToken : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// 48 hexadecimal digits, given out once, here. Throws store::AlreadyExists when there is an account.
std::string NewSetupToken(store::Store& store, const base::BootTime& now);

// Where the addresses that hold the newest token are kept for the owner to read; removed once there is an account.
std::filesystem::path SetupAddressFile(const base::Installation& installation);

// Whether AddFirstAccount would take the token, which may hold any bytes: to be asked before a password is hashed.
// Throws InvalidToken, and store::AlreadyExists when there is an account.
void RequireSetupToken(store::Store& store, std::string_view token, const base::BootTime& now);

// The owner account, whose name follows the rules of store::Users::Add, and an entry in the audit log. Of any number
// of callers at once, one makes it. address: where the request came from. Throws as RequireSetupToken does, and
// store::InvalidRecord for a name that cannot be one, after which the token is still valid.
store::User AddFirstAccount(store::Store& store, std::string_view token, const std::string& name,
                            const store::HashedPassword& password, const std::string& address,
                            const base::BootTime& now);

}  // namespace lookhaven::admin
