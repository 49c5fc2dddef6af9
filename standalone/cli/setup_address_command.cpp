// SPDX-License-Identifier: Apache-2.0
//
// lookhaven setup-address: the one-time address at which a browser makes the first account.
#include <algorithm>
#include <exception>
#include <filesystem>
#include <functional>
#include <system_error>

#include "standalone/admin/first_account.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/host_name.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/doctor/web_listeners.h"
#include "standalone/remote/certificate.h"
#include "standalone/store/users.h"

namespace lookhaven::cli {

namespace {

struct Request {
    bool if_needed = false;
};

// The fragment, which a browser sends to no server and writes to none of its logs, stands after each address that the
// web server answers at; by itself where that is another's.
std::vector<std::string> AddressesOf(const base::Installation& installation, const std::string& fragment) {
    std::vector<std::string> addresses;
    for (const doctor::WebListener& listener : doctor::WebListenersOf(installation)) {
        const std::string host = listener.has_tls ? "https://" + base::OwnHostName() : "http://" + listener.host;
        const std::string address = Concat(host, ":", listener.port, "/", fragment);
        if (std::ranges::find(addresses, address) == addresses.end()) {
            addresses.push_back(address);
        }
    }
    return addresses.empty() ? std::vector{fragment} : addresses;
}

// Empty where there is no certificate, or none that can be read, which the doctor tells.
std::string FingerprintOf(const base::Installation& installation) {
    try {
        return remote::ReadCertificate(base::ReadFile(installation.TlsFolder() / "certificate.pem")).fingerprint;
    } catch (const std::exception&) {
        return "";
    }
}

std::string TextOf(const std::vector<std::string>& addresses, const std::string& fingerprint) {
    constexpr std::int64_t kMinutes = admin::kSetupTokenLifetimeS / 60;
    std::string text = addresses.front().front() == '#'
                           ? Concat("There is no account yet. To make the first one, open Lookhaven's page in a browser"
                                    " within ",
                                    kMinutes, " minutes, with this at the end of its address:\n")
                           : Concat("There is no account yet. To make the first one, open this in a browser within ",
                                    kMinutes, " minutes (http:// on this machine only):\n");
    for (const std::string& address : addresses) {
        text += "\n    " + address;
    }
    text += "\n\nIt works once. lookhaven setup-address prints a new one, which replaces it.";
    return fingerprint.empty()
               ? text
               : text + "\n\nThe fingerprint (SHA-256) of the certificate that the browser then shows:\n\n    " +
                     fingerprint;
}

void Print(const Console& console, const Request& request) {
    const base::Installation installation = console.Installation();
    store::Store store = console.OpenStore();
    const std::filesystem::path file = admin::SetupAddressFile(installation);
    if (request.if_needed && !store::Users(store).IsEmpty()) {
        std::error_code ignored;
        std::filesystem::remove(file, ignored);
        console.Answer(Object("address", Json::arrayValue), "");
        return;
    }
    const std::vector<std::string> addresses =
        AddressesOf(installation, "#setup=" + admin::NewSetupToken(store, base::TimeSinceBoot()));
    const std::string fingerprint = FingerprintOf(installation);
    const std::string text = TextOf(addresses, fingerprint);
    // First: the one before is void already, should there be no room for the file.
    console.Answer(Object("address", Array(addresses, std::identity()), "seconds",
                          Json::Int64{admin::kSetupTokenLifetimeS}, "fingerprint", fingerprint),
                   text);
    base::WriteFileAtomically(file, text + '\n');
}

}  // namespace

void AddSetupAddress(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console);
    group.Add("setup-address", "Prints the one-time address at which a browser makes the first account", Print)
        .Flag("--if-needed", group.request().if_needed, "Prints nothing when there is an account already");
}

}  // namespace lookhaven::cli
