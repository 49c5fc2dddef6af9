// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/mount_status.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <sstream>

#include "standalone/base/file.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::array kNames{"ready", "not-mounted", "in-use", "failing", "space-held", "kept-full"};

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "mounts";
}

}  // namespace

const char* NameOf(MountState state) {
    return kNames.at(static_cast<std::size_t>(state));
}

void WriteMountStatus(const base::Installation& installation, const std::vector<MountStatus>& mounts) {
    std::ostringstream text;
    for (const MountStatus& each : mounts) {
        std::string reason = each.reason;
        std::ranges::replace(reason, '\n', ' ');
        text << each.mount << ' ' << NameOf(each.state) << ' ' << reason << '\n';
    }
    base::WriteFileAtomically(PathOf(installation), text.str());
}

std::vector<MountStatus> ReadMountStatus(const base::Installation& installation) {
    std::vector<MountStatus> mounts;
    std::error_code ignored;
    if (!std::filesystem::exists(PathOf(installation), ignored)) {
        return mounts;
    }
    std::istringstream text(base::ReadFile(PathOf(installation)));
    for (std::string line; std::getline(text, line);) {
        std::istringstream fields(line);
        MountStatus each;
        std::string state;
        fields >> each.mount >> state;
        const auto* const name = std::ranges::find(kNames, state);
        if (fields && name != kNames.end()) {
            each.state = static_cast<MountState>(name - kNames.begin());
            std::getline(fields >> std::ws, each.reason);
            mounts.push_back(each);
        }
    }
    return mounts;
}

}  // namespace lookhaven::maintenance
