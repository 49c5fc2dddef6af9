// SPDX-License-Identifier: Apache-2.0
//
// Checks passwords that a caller gives: each costs 64 MiB and a tenth of a second, and wrong ones are throttled.
#pragma once

#include <initializer_list>
#include <string>

#include "standalone/api/call.h"
#include "standalone/store/users.h"

namespace lookhaven::api {

// Held while a password is checked or hashed for a request; one at a time in a process.
class HashingPermit {
  public:
    // Throws Failure 503 when there is none.
    explicit HashingPermit(const Call& call);
    ~HashingPermit();
    HashingPermit(const HashingPermit&) = delete;
    HashingPermit& operator=(const HashingPermit&) = delete;

  private:
    control::Slot& slot_;
};

// The account of that name and password. Throws Failure 401 for a wrong one; 429 after too many attempts, without
// taking a hashing permit; 503 where there is no permit, which does not count as an attempt.
store::VerifiedUser CheckPassword(const Call& call, const std::string& account, const std::string& password);

// The caller, who gives their password again in the parameter of that name. A wrong one counts and is logged as that
// of a log-in. Throws Failure 403 for a wrong one, so that a client does not take its session for ended; 429 and 503.
store::VerifiedUser Reauthenticate(const Call& call, const std::string& parameter);

// Whether admin::AddFirstAccount would take the token. Hashes no password; attempts are limited by network, as log-ins
// are. Throws admin::InvalidToken; store::AlreadyExists when there is an account; Failure 429.
void CheckSetupToken(const Call& call, const std::string& token);

// Counts an attempt with a secret that is no password by the caller's network, as a log-in is counted by account and
// network. secret: what it is, "setup token"; no account has a name with a space. Throws Failure 429 from the sixth
// within a minute on. Call it for wrong secrets, after checking them.
void CountAttempt(const Call& call, const char* secret);

// The new password of the parameter of that name, not hashed yet. To be asked before anything is hashed. Throws
// store::InvalidRecord for what is no password; Json::Exception for what is no text.
std::string RequireNewPassword(const Call& call, const std::string& parameter);

// Throws Failure 503; store::InvalidRecord for what is no password.
store::HashedPassword Hash(const Call& call, const std::string& password);

// Throws Failure 400 for one of the parameters in the address, which ends up in logs and browser histories.
void RequireNotInQuery(const Call& call, std::initializer_list<const char*> names);
// The same for every password that a method takes.
void RequireNoPasswordInQuery(const Call& call);

}  // namespace lookhaven::api
