// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/pair_by_code.h"

#include "standalone/admin/servers.h"
#include "standalone/base/host_name.h"
#include "standalone/base/log.h"
#include "standalone/remote/camera_list.h"
#include "standalone/remote/certificate_loader.h"
#include "standalone/remote/fetch.h"
#include "standalone/remote/token_code.h"
#include "standalone/store/sessions.h"

namespace lookhaven::admin {

namespace {

using Reason = CannotPair::Reason;

constexpr long kForbidden = 403;
constexpr long kTooMany = 429;

CannotPair Failed(Reason why) {
    switch (why) {
    case Reason::kUnreachable:
        return {why, "no host that can be paired by a code answers at this address and port"};
    case Reason::kCertificate:
        return {why,
                "what answers at this address is not the host that shows the code: its certificate is another one, "
                "or has expired"};
    case Reason::kCode:
        return {why, "the code is not valid there: it is used up, older than ten minutes, or replaced by a newer one"};
    case Reason::kTooMany:
        return {why,
                "the code is wrong, or too much was asked of the other host at once: compare it, or show a new one"};
    case Reason::kUnclear:
        return {
            why,
            "the other host's answer cannot be used; it may have paired itself already, and ended a pairing that it "
            "had under this name: try again with the same code"};
    }
    throw std::logic_error("an unknown reason");
}

// The certificates of the host that showed the code, and of nobody else.
std::string FetchRightCertificates(const std::string& address, int port, const remote::PairingCode& code) {
    std::string certificates;
    try {
        certificates = remote::FetchCertificates(address, port);
    } catch (const remote::NoAnswer&) {
        throw Failed(Reason::kUnreachable);
    }
    try {
        if (remote::FingerprintPrefix(remote::LoadAndReadCertificate(certificates)) == code.fingerprint_prefix) {
            return certificates;
        }
    } catch (const remote::InvalidCertificate&) {
        // it shows none
    }
    throw Failed(Reason::kCertificate);
}

// The server's own one, without those of its issuers, which may have issued others.
std::string FirstOf(const std::string& certificates) {
    constexpr std::string_view kEnd = "-----END CERTIFICATE-----\n";
    return certificates.substr(0, certificates.find(kEnd) + kEnd.size());
}

struct Offer {
    std::string secret;
    std::vector<store::RemoteCamera> cameras;
};

// What makes the next attempt with the code the same one to the other host, and nobody else's.
std::string AttemptOf(store::Store& store, const remote::PairingCode& code) {
    return remote::TokenCode(store::Sessions(store).Key(), "lookhaven pairing attempt 1\n" + code.secret);
}

Offer Accept(const store::RecordingServer& server, const remote::PairingCode& code, const std::string& attempt) {
    try {
        const Json::Value data = remote::DataInAnswer(remote::FetchJson(
            {server.address, server.port, FirstOf(server.certificate)},
            {"api=VEXO.Pairing&version=1&method=Accept", "", "code=" + code.secret + "&attempt=" + attempt}));
        return {data["secret"].asString(), remote::CamerasIn(data["camera"])};
    } catch (const remote::WrongCertificate&) {
        throw Failed(Reason::kCertificate);
    } catch (const remote::InvalidCertificate&) {
        throw Failed(Reason::kCertificate);
    } catch (const remote::NoAnswer& refusal) {
        throw Failed(refusal.status == kForbidden ? Reason::kCode
                     : refusal.status == kTooMany ? Reason::kTooMany
                                                  : Reason::kUnclear);
    } catch (const Json::Exception&) {
        throw Failed(Reason::kUnclear);
    }
}

}  // namespace

PairingOutcome PairByCode(const Records& records, const Actor& actor, store::RecordingServer server,
                          const remote::PairingCode& code, bool confirmed) {
    RequireManager(records.open(), actor);
    if (!base::IsHost(server.address) || server.port < 1 || server.port > 65'535) {
        throw store::InvalidRecord("a host is reached by a host name or address, and a port from 1 to 65535");
    }
    records.close();
    server.certificate = FetchRightCertificates(server.address, server.port, code);
    store::RecordingServers(records.open()).RequirePairable(server);
    if (!confirmed) {
        RequireSameServer(records.open(), server);
    }
    const std::string attempt = AttemptOf(records.open(), code);
    records.close();
    const Offer offer = Accept(server, code, attempt);
    try {
        return {AddServer(records.open(), actor, server, offer.secret, offer.cameras,
                          {.shows_cameras = true, .confirmed = confirmed}),
                offer.secret, offer.cameras.size()};
    } catch (const store::StoreError& error) {
        base::LogError(std::string("a host that has accepted this one cannot be stored: ") + error.what());
        throw Failed(Reason::kUnclear);
    }
}

}  // namespace lookhaven::admin
