// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/certificate.h"

#include <system_error>

#include "standalone/admin/certificate.h"
#include "standalone/admin/web_server.h"
#include "standalone/api/fields.h"
#include "standalone/api/password_check.h"

namespace lookhaven::api {

namespace {

std::string TextIn(const Call& call, const char* name) {
    std::string text;
    TakeField(call, name, text);
    if (text.empty()) {
        RefuseField(name, "a text in PEM format");
    }
    return text;
}

}  // namespace

std::string SetCertificate(const Call& call) {
    RequireNotInQuery(call, {"certificate", "key", "reauth"});
    const base::Installation& installation = call.context.Installation();
    const admin::CertificateOffer offer{TextIn(call, "certificate"), TextIn(call, "key")};
    bool is_confirmed = false;
    TakeField(call, "confirm", is_confirmed);
    Json::Value data;
    if (!is_confirmed) {
        data["confirm"] = admin::ExamineCertificate(call.Records(), installation, call.Actor(), offer);
        return SuccessAnswer(data);
    }
    Reauthenticate(call, "reauth");
    try {
        data["certificate"] = admin::ReplaceCertificate(
            call.Records(), installation, call.Actor(), offer,
            [&](const std::string& fingerprint) { return admin::ReloadWebServer(installation, fingerprint); });
    } catch (const admin::WebServerRefused& error) {
        throw Failure(502, error.what());
    } catch (const std::system_error& error) {
        throw Failure(500, std::string("the certificate stays as it is: ") + error.what());
    }
    return SuccessAnswer(data);
}

}  // namespace lookhaven::api
