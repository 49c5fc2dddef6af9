// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/certificate.h"

#include "standalone/admin/certificate_folder.h"
#include "standalone/admin/change.h"
#include "standalone/admin/web_server.h"
#include "standalone/base/blocked_signals.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/remote/certificate_loader.h"
#include "standalone/store/servers.h"

namespace lookhaven::admin {

namespace {

constexpr const char* kAction = "certificate.set";
constexpr const char* kObject = "web server";

remote::CertificatePair Read(const CertificateOffer& offer) try {
    return remote::LoadAndReadCertificatePair(offer.certificates, offer.key, base::WallSeconds());
} catch (const remote::InvalidCertificate& error) {
    throw store::InvalidRecord(error.what());
}

// Null for what cannot be read.
Json::Value RecordOf(const std::string& certificates) try {
    return certificates.empty() ? Json::Value() : CertificateRecord(remote::LoadAndReadCertificate(certificates));
} catch (const remote::InvalidCertificate&) {
    return {};
}

// Hosts without an address are those that connect to this one.
Json::Value HostsThatRefuse(store::Store& store, const std::string& known, const std::string& offered) {
    Json::Value names = Json::arrayValue;
    if (remote::LoadAndFindTrust(known, offered)) {
        return names;
    }
    for (const store::RecordingServer& server : store::RecordingServers(store).List()) {
        if (server.address.empty()) {
            names.append(server.name);
        }
    }
    return names;
}

Json::Value Told(store::Store& store, const std::string& known, const remote::CertificatePair& pair) {
    Json::Value record = CertificateRecord(pair.facts);
    record["pairedHosts"] = HostsThatRefuse(store, known, pair.certificates);
    return record;
}

}  // namespace

Json::Value CertificateRecord(const remote::CertificateFacts& facts) {
    Json::Value json;
    json["subject"] = facts.subject;
    json["name"] = Json::arrayValue;
    for (const std::string& name : facts.names) {
        json["name"].append(name);
    }
    json["fingerprint"] = facts.fingerprint;
    json["end"] = Json::Int64{facts.end_s};
    json["selfSigned"] = facts.is_self_signed;
    return json;
}

Json::Value CurrentCertificate(const base::Installation& installation) {
    const std::filesystem::path path = installation.TlsFolder() / "certificate.pem";
    if (std::error_code ignored; !std::filesystem::exists(path, ignored)) {
        return {};
    }
    return CertificateRecord(remote::LoadAndReadCertificate(base::ReadFile(path)));
}

Json::Value ExamineCertificate(store::Store& store, const base::Installation& installation, const Actor& actor,
                               const CertificateOffer& offer) {
    RequireManager(store, actor);
    return Told(store, CertificateFolder::Certificates(installation), Read(offer));
}

Json::Value ReplaceCertificate(store::Store& store, const base::Installation& installation, const Actor& actor,
                               const CertificateOffer& offer, const Reload& reload) {
    RequireManager(store, actor);
    const remote::CertificatePair pair = Read(offer);
    // Even if the client hangs up meanwhile, the web server is told to reload.
    const base::BlockedSignals whole;
    CertificateFolder folder(installation);
    const std::string known = CertificateFolder::Certificates(installation);
    const Json::Value before = RecordOf(known);
    const Json::Value after = CertificateRecord(pair.facts);
    Json::Value told = Told(store, known, pair);
    folder.Prepare(pair.certificates, pair.key);
    bool is_exchanged = false;
    try {
        Apply(store, actor, [&] {
            if (!is_exchanged) {
                folder.Exchange();
                is_exchanged = true;
            }
            return Change{kAction, kObject, before, after};
        });
        told["reloaded"] = reload(pair.facts.fingerprint);
    } catch (const WebServerRefused& refused) {
        folder.Exchange();
        const char* outcome = "; the certificate from before is in use again";
        try {
            reload(before["fingerprint"].asString());
        } catch (const WebServerRefused&) {
            outcome = "; the certificate from before is on the disk again";
        }
        Apply(store, actor, [&] { return Change{kAction, kObject, after, before}; });
        throw WebServerRefused(refused.what() + std::string(outcome));
    } catch (...) {
        if (is_exchanged) {
            folder.Exchange();
        }
        throw;
    }
    return told;
}

}  // namespace lookhaven::admin
