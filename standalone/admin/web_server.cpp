// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/web_server.h"

#include <algorithm>
#include <charconv>
#include <chrono>
#include <csignal>
#include <thread>

#include "standalone/base/file.h"
#include "standalone/doctor/web_listeners.h"
#include "standalone/remote/certificate_loader.h"
#include "standalone/remote/fetch.h"

namespace lookhaven::admin {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kMaxWait{10};
constexpr std::chrono::milliseconds kPause{50};

// 0 where it does not run. Its file is not all: it stays behind a killed one, whose id another process may have got.
pid_t FindWebServer(const base::Installation& installation) {
    pid_t pid = 0;
    try {
        const std::string text = base::ReadFile(installation.RunFolder() / "nginx.pid");
        std::from_chars(text.data(), text.data() + text.size(), pid);
        return pid > 1 && base::ReadFile("/proc/" + std::to_string(pid) + "/comm") == "nginx\n" ? pid : 0;
    } catch (const std::system_error&) {
        return 0;
    }
}

bool Shows(const doctor::WebListener& listener, const std::string& fingerprint) try {
    const std::string shown = remote::FetchCertificates(listener.host, std::stoi(listener.port));
    return remote::LoadAndReadCertificate(shown).fingerprint == fingerprint;
} catch (const remote::NoAnswer&) {
    return false;
} catch (const remote::InvalidCertificate&) {
    return false;
}

}  // namespace

bool ReloadWebServer(const base::Installation& installation, const std::string& fingerprint) {
    std::vector<doctor::WebListener> listeners = doctor::WebListenersOf(installation);
    std::erase_if(listeners, [](const doctor::WebListener& listener) { return !listener.has_tls; });
    const pid_t server = FindWebServer(installation);
    if (server == 0) {
        return false;
    }
    if (listeners.empty()) {
        throw WebServerRefused("the web server has no HTTPS port that this host knows of");
    }
    if (::kill(server, SIGHUP) != 0) {
        throw WebServerRefused("the web server is not this account's to tell");
    }
    const auto end = Clock::now() + kMaxWait;
    for (const doctor::WebListener& listener : listeners) {
        while (!Shows(listener, fingerprint)) {
            if (Clock::now() >= end) {
                throw WebServerRefused("the web server still shows another certificate: see " +
                                       (installation.LogFolder() / "nginx.log").string());
            }
            std::this_thread::sleep_for(kPause);
        }
    }
    return true;
}

}  // namespace lookhaven::admin
