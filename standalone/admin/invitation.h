// SPDX-License-Identifier: Apache-2.0
//
// A code that is shown here and typed on another host, which then may show this one's cameras.
//
// Invariants    (1) At most one code is valid: a new one voids the one before.
//               (2) It makes one pairing, of which whoever made it may ask again, as when the answer was lost; while
//                   the account that asked for it is a manager's, with the same password, and its sessions were not
//                   ended; for kInvitationLifetimeS, which setting the clock does not lengthen; and not beyond a
//                   restart of the machine.
//               (3) The store holds the digest of its secret only.
//               (4) Wrong guesses, however many, void no code, and change nothing.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>

#include "standalone/admin/actor.h"
#include "standalone/base/clock.h"
#include "standalone/remote/certificate.h"

namespace lookhaven::admin {

constexpr std::int64_t kInvitationLifetimeS = std::int64_t{10} * 60;

// A new code, as remote/pairing_code.h has it, given out once, here. name: what the other host will be called here, as
// for AdmitServer. certificate: that of this host's web server. Throws as AdmitServer does.
std::string Invite(store::Store& store, const Actor& actor, const std::string& name,
                   const remote::CertificateFacts& certificate, const base::BootTime& now);

// The code is no valid one, or no longer; nothing was changed.
class InvalidInvitation : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// Voids the code that this account has asked for, if one is valid. Call it where the account's access is taken back.
void VoidInvitationOf(store::Store& store, int user_id);

// Throws InvalidInvitation where no code, whatever its secret, could be accepted now: then there is nothing to be
// guessed. Reads alone.
void RequireInvitation(store::Store& store, const base::BootTime& now);

// Makes the pairing for a caller who knows the secret of the code, which may hold any bytes, and returns the secret
// that the two hosts share from now on. attempt: a secret of the caller's own, any bytes; who gives the same one again
// changes nothing and gets the same answer, unless that pairing has ended; empty: nobody does. address: where the
// request came from. Of several callers at once, one makes it. Throws InvalidInvitation, without waiting for anybody's
// change where the secret is wrong; store::AlreadyExists where the name has been given to a host of the other kind
// meanwhile, after which the code is still valid.
std::string AcceptInvitation(store::Store& store, std::string_view secret, std::string_view attempt,
                             const std::string& address, const base::BootTime& now);

}  // namespace lookhaven::admin
