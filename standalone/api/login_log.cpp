// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/login_log.h"

#include <algorithm>
#include <string>

#include <fcntl.h>
#include <json/json.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/base/log.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxAccountBytes = 64;  // no account's name is longer

// In quotes, so that a text cannot pass for more than it is, and in printable ASCII, so that it injects no terminal
// control sequences.
std::string Quoted(std::string_view text) {
    std::string quoted = Json::valueToQuotedString(std::string(text.substr(0, kMaxAccountBytes)).c_str());
    std::replace(quoted.begin(), quoted.end(), '\x7f', ' ');
    return quoted;
}

void Append(const std::filesystem::path& path, std::string_view account, std::string_view address,
            std::string_view outcome) try {
    const std::string text = Quoted(account) + " from " + Quoted(address) + ": ";
    const std::string line = base::FormatUtc(base::WallMillis()) + ' ' + text + std::string(outcome) + '\n';
    const base::FileDescriptor file(::open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!file || ::write(file.Get(), line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
        base::LogWarning("cannot write to " + path.string() + ": " + text + std::string(outcome));
    }
} catch (const std::exception& error) {
    base::LogError(std::string("cannot log a log-in: ") + error.what());
}

}  // namespace

void LogAccepted(const base::Installation& installation, std::string_view account, std::string_view address) {
    Append(installation.LogFolder() / "log-ins.log", account, address, "logged in");
}

void LogRefused(const base::Installation& installation, std::string_view account, std::string_view address,
                std::string_view reason) {
    Append(installation.LogFolder() / "refused-log-ins.log", account, address, reason);
}

}  // namespace lookhaven::api
