// SPDX-License-Identifier: Apache-2.0
//
// The certificate by which browsers and paired hosts know this host.
//
// Failures      Each throws Forbidden; store::InvalidRecord for what is no usable pair, with a sentence that quotes
//               nothing of it; store::StoreError; std::system_error where the files cannot be written. Then nothing was
//               changed.
#pragma once

#include <functional>
#include <string>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/base/installation.h"
#include "standalone/remote/certificate.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

struct CertificateOffer {
    std::string certificates;  // PEM: the server's own, then its issuers
    std::string key;           // PEM; comes out of none of these functions
};

// {"subject", "name": [host names and addresses], "fingerprint", "end": UTC seconds, "selfSigned"}
Json::Value CertificateRecord(const remote::CertificateFacts& facts);

// The record of the one in use; null where there is none. Throws remote::InvalidCertificate, std::runtime_error.
Json::Value CurrentCertificate(const base::Installation& installation);

// What is offered, as CertificateRecord has it, with "pairedHosts": the names of the hosts that were paired by the
// certificate in use and would take the new one for a stranger's: they must be paired again. Changes nothing.
Json::Value ExamineCertificate(store::Store& store, const base::Installation& installation, const Actor& actor,
                               const CertificateOffer& offer);

// As ReloadWebServer.
using Reload = std::function<bool(const std::string& fingerprint)>;

// Replaces certificate and key, and lets the web server read them. Returns what ExamineCertificate does, and
// "reloaded": whether a web server runs and shows it. Throws also WebServerRefused: then the ones from before are back.
Json::Value ReplaceCertificate(store::Store& store, const base::Installation& installation, const Actor& actor,
                               const CertificateOffer& offer, const Reload& reload);

}  // namespace lookhaven::admin
