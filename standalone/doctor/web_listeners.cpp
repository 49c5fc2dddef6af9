// SPDX-License-Identifier: Apache-2.0
#include "standalone/doctor/web_listeners.h"

#include <fstream>
#include <regex>

namespace lookhaven::doctor {

std::filesystem::path WebServerConfiguration(const base::Installation& installation) {
    return installation.RunFolder() / "nginx.conf";
}

std::vector<WebListener> WebListenersOf(const base::Installation& installation) {
    std::vector<WebListener> listeners;
    std::ifstream file(WebServerConfiguration(installation));
    static const std::regex kListen(R"(^\s*listen (?:(\[::\]|[0-9.]+):)?([0-9]+)( ssl)?.*)");
    std::smatch match;
    for (std::string line; std::getline(file, line);) {
        if (std::regex_match(line, match, kListen)) {
            const std::string host = match[1] == "[::]" ? "::1" : "127.0.0.1";
            listeners.push_back({host, match[2], match[3].matched});
        }
    }
    return listeners;
}

}  // namespace lookhaven::doctor
