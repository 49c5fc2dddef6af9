// SPDX-License-Identifier: Apache-2.0
//
// lookhaven certificate: the one by which browsers and paired hosts know this host.
#include "standalone/admin/certificate.h"
#include "standalone/admin/web_server.h"
#include "standalone/base/amounts.h"
#include "standalone/base/file.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"

namespace lookhaven::cli {

namespace {

struct Request {
    std::string certificate;
    std::string key;
    bool is_confirmed = false;
};

std::string Joined(const Json::Value& names) {
    std::string text;
    for (const Json::Value& name : names) {
        text += (text.empty() ? "" : ", ") + name.asString();
    }
    return text;
}

std::string Text(const Json::Value& record) {
    const std::string names = Joined(record["name"]);
    return Concat("subject      ", record["subject"].asString(), "\nnames        ", names.empty() ? "none" : names,
                  "\nexpires      ", base::FormatMoment(record["end"].asInt64()), "\nsigned by    ",
                  record["selfSigned"].asBool() ? "itself" : "an authority", "\nfingerprint  ",
                  record["fingerprint"].asString(), '\n');
}

void Show(const Console& console) {
    const Json::Value record = admin::CurrentCertificate(console.Installation());
    if (record.isNull()) {
        throw Failure(kNoInput, "there is no certificate yet: the server makes one when it starts");
    }
    console.Answer(record, Text(record));
}

// Reads both before the store is opened: root may read files that the owner of the state folder may not.
void Set(const Console& console, const Request& request) {
    const admin::CertificateOffer offer{base::ReadFile(request.certificate), base::ReadFile(request.key)};
    store::Store store = console.OpenStore();
    const base::Installation installation = console.Installation();
    if (!request.is_confirmed) {
        const Json::Value told = admin::ExamineCertificate(store, installation, {}, offer);
        if (const std::string hosts = Joined(told["pairedHosts"]); !hosts.empty()) {
            throw Failure(kDataError, "these hosts know this one by its certificate, and must be paired again: ", hosts,
                          "; to replace it all the same, add --confirm");
        }
    }
    const Json::Value done =
        admin::ReplaceCertificate(store, installation, {}, offer, [&](const std::string& fingerprint) {
            return admin::ReloadWebServer(installation, fingerprint);
        });
    const std::string hosts = Joined(done["pairedHosts"]);
    console.Answer(done, Text(done),
                   done["reloaded"].asBool() ? "The web server shows it.\n"
                                             : "The web server does not run; it shows it when it starts.\n",
                   hosts.empty() ? "" : "To be paired again: " + hosts + '\n');
}

}  // namespace

void AddCertificate(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "certificate", "The web server's certificate");
    Request& request = group.request();
    group.Add("show", "Shows it with its fingerprint", Show);
    group.Add("set", "Replaces it, after a check of both files", Set)
        .Option("certificate", request.certificate, "PEM file: the server's certificate, then its issuers'", Required)
        .Option("key", request.key, "PEM file: its private key, without a password", Required)
        .Flag("--confirm", request.is_confirmed, "Even where hosts must be paired again");
}

}  // namespace lookhaven::cli
