// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/host_status.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <sstream>
#include <string>

#include "standalone/base/file.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::array kNames{"local", "online", "offline"};

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "hosts";
}

std::set<int> HostsThatAre(const base::Installation& installation, bool offline) {
    std::set<int> hosts;
    for (const HostStatus& each : ReadHostStatus(installation)) {
        if ((each.state == HostState::kOffline) == offline) {
            hosts.insert(each.host);
        }
    }
    return hosts;
}

}  // namespace

const char* NameOf(HostState state) {
    return kNames.at(static_cast<std::size_t>(state));
}

void WriteHostStatus(const base::Installation& installation, const std::vector<HostStatus>& hosts) {
    std::ostringstream text;
    for (const HostStatus& each : hosts) {
        text << each.host << ' ' << NameOf(each.state) << ' ' << each.cameras << '\n';
    }
    base::WriteFileAtomically(PathOf(installation), text.str());
}

std::vector<HostStatus> ReadHostStatus(const base::Installation& installation) {
    std::vector<HostStatus> hosts;
    std::error_code ignored;
    if (!std::filesystem::exists(PathOf(installation), ignored)) {
        return hosts;
    }
    std::istringstream text(base::ReadFile(PathOf(installation)));
    HostStatus each;
    for (std::string state; text >> each.host >> state >> each.cameras;) {
        if (const auto* const name = std::ranges::find(kNames, state); name != kNames.end()) {
            each.state = static_cast<HostState>(name - kNames.begin());
            hosts.push_back(each);
        }
    }
    return hosts;
}

std::set<int> OfflineHosts(const base::Installation& installation) {
    return HostsThatAre(installation, true);
}

std::set<int> OnlineHosts(const base::Installation& installation) {
    return HostsThatAre(installation, false);
}

}  // namespace lookhaven::maintenance
