// SPDX-License-Identifier: Apache-2.0
//
// Pairs this host with one whose cameras it is to show, by the code that is shown there.
#pragma once

#include <functional>
#include <stdexcept>
#include <string>

#include "standalone/admin/actor.h"
#include "standalone/remote/pairing_code.h"
#include "standalone/store/servers.h"

namespace lookhaven::admin {

// Nothing was changed here; there, with kUnclear, a pairing may have been made, which the next attempt with the same
// code finds. A manager can name any address that
// this machine reaches, so the text says no more of what answers there than the reason.
class CannotPair : public std::runtime_error {
  public:
    enum class Reason {
        kUnreachable,  // no web server with TLS, or one that does not know how to pair by a code
        kCertificate,  // it shows another certificate, or one that has expired
        kCode,         // wrong, used, expired, or replaced by a newer one
        kTooMany,      // wrong, after many others from this host's network; or its web server was asked too much
        kUnclear,      // the code was sent; nobody else can use it, if it was taken
    };

    CannotPair(Reason why, const std::string& text) : std::runtime_error(text), why_(why) {}
    Reason Why() const { return why_; }

  private:
    Reason why_;
};

struct PairingOutcome {
    store::RecordingServer server;
    std::string secret;  // that both hosts share
    std::size_t cameras = 0;
};

// The caller's record store, which is closed while the other host is waited for.
struct Records {
    std::function<store::Store&()> open;
    std::function<void()> close = [] {};
};

// Connects to the server's address, compares the certificate with the code before anything else is sent, and stores the
// host with its cameras under its name, as AddServer does, with central management on. Only name, address and port of
// the server are looked at. Blocks for 25 seconds at most. Throws CannotPair, and as AddServer does; before the code is
// used up, for a name or address that cannot be stored, and MovesDenials unless confirmed.
PairingOutcome PairByCode(const Records& records, const Actor& actor, store::RecordingServer server,
                          const remote::PairingCode& code, bool confirmed);

}  // namespace lookhaven::admin
