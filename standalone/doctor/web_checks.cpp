// SPDX-License-Identifier: Apache-2.0
//
// What stands between this host and others: the web server, its certificate, IPv6, and the hosts that it is paired
// with.
#include <algorithm>
#include <filesystem>
#include <fstream>

#include <netdb.h>
#include <sys/socket.h>

#include "standalone/base/amounts.h"
#include "standalone/base/clock.h"
#include "standalone/base/concat.h"
#include "standalone/base/file.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/doctor/checks.h"
#include "standalone/doctor/web_listeners.h"
#include "standalone/remote/certificate_loader.h"
#include "standalone/remote/paired_host.h"

namespace lookhaven::doctor {

namespace {

using base::Concat;
using base::FormatMoment;

constexpr int kTimeoutMs = 3000;
constexpr std::int64_t kNoticeSeconds = 30 * 86400;

base::FileDescriptor Connect(const WebListener& listener) {
    addrinfo hints{};
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = AI_NUMERICHOST | AI_NUMERICSERV;
    addrinfo* found = nullptr;
    if (::getaddrinfo(listener.host.c_str(), listener.port.c_str(), &hints, &found) != 0) {
        return {};
    }
    base::FileDescriptor socket(::socket(found->ai_family, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const timeval limit{kTimeoutMs / 1000, 0};
    ::setsockopt(socket.Get(), SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
    ::setsockopt(socket.Get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    const bool is_connected = ::connect(socket.Get(), found->ai_addr, found->ai_addrlen) == 0;
    ::freeaddrinfo(found);
    return is_connected ? std::move(socket) : base::FileDescriptor();
}

// Whether the web server answers; on a TLS port, only whether it accepts connections.
bool Answers(const WebListener& listener) {
    constexpr std::string_view kRequest = "GET / HTTP/1.0\r\nHost: localhost\r\n\r\n";
    const base::FileDescriptor socket = Connect(listener);
    char byte = 0;
    return socket && (listener.has_tls || (::send(socket.Get(), kRequest.data(), kRequest.size(), MSG_NOSIGNAL) > 0 &&
                                           ::recv(socket.Get(), &byte, 1, 0) == 1 && byte == 'H'));
}

// The file has size 0 even where it has lines.
bool HasIpv6() {
    std::ifstream addresses("/proc/net/if_inet6");
    return addresses.peek() != std::ifstream::traits_type::eof();
}

}  // namespace

Findings CheckWebServer(const base::Installation& installation) {
    const std::vector<WebListener> listeners = WebListenersOf(installation);
    Findings findings;
    // The service's own configuration goes when it ends.
    if (std::error_code ignored;
        listeners.empty() && std::filesystem::is_symlink(WebServerConfiguration(installation), ignored)) {
        findings.push_back({"the web server does not run", HowToStart(installation, installation.LogFolder())});
    }
    for (const WebListener& listener : listeners) {
        if (!Answers(listener)) {
            findings.push_back({Concat("the web server does not answer at ", listener.host, " port ", listener.port),
                                HowToStart(installation, installation.LogFolder() / "nginx.log")});
        }
    }
    if (!listeners.empty() && HasIpv6() && std::ranges::find(listeners, "::1", &WebListener::host) == listeners.end()) {
        findings.push_back({"this machine has IPv6, where the web server does not listen",
                            "restart the server, which looks for IPv6 when it starts", Severity::kNote});
    }
    return findings;
}

Findings CheckCertificate(const base::Installation& installation) {
    const std::filesystem::path path = installation.TlsFolder() / "certificate.pem";
    std::error_code ignored;
    if (!std::filesystem::exists(path, ignored)) {
        return WebListenersOf(installation).empty()
                   ? Findings()
                   : Findings{{"there is no certificate at " + path.string(), "restart the server, which makes one"}};
    }
    const std::string remedy =
        "replace it by a valid one: lookhaven certificate set CERTIFICATE KEY; a self-signed one that was made here is "
        "replaced when the server restarts";
    try {
        const std::int64_t end_s = remote::LoadAndReadCertificate(base::ReadFile(path)).end_s;
        const std::int64_t left_s = end_s - base::WallSeconds();
        if (left_s > kNoticeSeconds) {
            return {};
        }
        return {{Concat("the certificate ", path.string(), left_s <= 0 ? " has expired on " : " expires on ",
                        FormatMoment(end_s)),
                 remedy, left_s <= 0 ? Severity::kFault : Severity::kNote}};
    } catch (const std::exception& error) {
        return {{Concat("the certificate ", path.string(), " cannot be used: ", error.what()), remedy}};
    }
}

Findings CheckPairedHosts(const base::Installation& installation) {
    Findings findings;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        for (const remote::PairedHostAnswer& answer : remote::AskPairedHosts(store)) {
            if (!answer.failure.empty()) {
                findings.push_back(
                    {Concat("the paired host ", answer.server.name, " at ", answer.server.address, " port ",
                            answer.server.port, " fails: ", answer.failure),
                     Concat("correct that, or give its new address: lookhaven server set ", answer.server.id,
                            " --address ADDRESS --port PORT; to leave it alone for now: lookhaven server set ",
                            answer.server.id, " --disable")});
            }
        }
    } catch (const std::exception&) {
        return {};  // CheckStore reports it
    }
    return findings;
}

}  // namespace lookhaven::doctor
