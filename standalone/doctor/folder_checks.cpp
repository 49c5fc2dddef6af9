// SPDX-License-Identifier: Apache-2.0
//
// The state folder: whose it is, who else may read it, whether anything can be written to it.
#include <algorithm>
#include <cerrno>
#include <iterator>
#include <system_error>

#include <pwd.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include "standalone/base/amounts.h"
#include "standalone/base/concat.h"
#include "standalone/doctor/checks.h"

namespace lookhaven::doctor {

namespace {

using base::Concat;
using base::FormatSize;

// The store, its write-ahead log, logs and sessions go on for some days in this.
constexpr std::uint64_t kMinFreeBytes = 64 << 20;

std::string UserName(uid_t user) {
    const passwd* entry = ::getpwuid(user);
    return entry == nullptr ? std::to_string(user) : entry->pw_name;
}

Findings CheckSpace(const std::string& home) {
    struct statvfs space {};
    if (::statvfs(home.c_str(), &space) != 0) {
        return {};
    }
    const std::uint64_t free_bytes = std::uint64_t{space.f_bavail} * space.f_frsize;
    if (free_bytes >= kMinFreeBytes) {
        return {};
    }
    return {{Concat("the disk of the state folder ", home, " has only ",
                    FormatSize(static_cast<std::int64_t>(free_bytes)), " left"),
             "free space on it; if recordings lie there, lower the limit of their mount with lookhaven mount set"}};
}

// The state folder holds secrets: cameras' passwords, the TLS key. Who may enter it reaches by name what it holds.
Findings CheckPrivacy(const std::string& path) {
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0) {
        return {};
    }
    Findings findings;
    if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0) {
        findings.push_back({path + " is open to other users", "chmod go= " + Quoted(path)});
    }
    if (status.st_uid != ::geteuid()) {
        findings.push_back({Concat(path, " belongs to ", UserName(status.st_uid)),
                            Concat("as root: chown -R ", OwnName(), ": ", Quoted(path))});
    } else if (::access(path.c_str(), S_ISDIR(status.st_mode) ? R_OK | W_OK | X_OK : R_OK | W_OK) != 0) {
        findings.push_back({path + " does not permit its owner to write to it", "chmod u+rwX " + Quoted(path)});
    }
    return findings;
}

}  // namespace

std::string OwnName() {
    return UserName(::geteuid());
}

std::string Quoted(const std::string& path) {
    if (path.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789/._+@,=:-") ==
        std::string::npos) {
        return path;
    }
    std::string quoted = "'";
    for (const char c : path) {
        quoted += c == '\'' ? "'\\''" : std::string(1, c);
    }
    return quoted + "'";
}

Findings CheckAccess(const std::string& title, const std::string& path) {
    struct stat status {};
    struct statvfs system {};
    if (::stat(path.c_str(), &status) != 0 || ::statvfs(path.c_str(), &system) != 0) {
        return {{Concat(title, " cannot be looked at: ", std::generic_category().message(errno)), "check its disk"}};
    }
    if ((system.f_flag & ST_RDONLY) != 0) {
        return {{title + " is on a file system that is mounted read-only",
                 "remount it, as root: mount -o remount,rw " + Quoted(path) +
                     "; where that fails or does not last, the disk does: see dmesg"}};
    }
    if (::access(path.c_str(), R_OK | W_OK | X_OK) == 0) {
        return {};
    }
    if (status.st_uid != ::geteuid()) {
        return {{Concat(title, " belongs to ", UserName(status.st_uid), " and cannot be written to"),
                 Concat("as root: chown -R ", OwnName(), ": ", Quoted(path))}};
    }
    return {{title + " does not permit its owner to write to it", "chmod u+rwx " + Quoted(path)}};
}

Findings CheckFolder(const base::Installation& installation) {
    const std::string home = installation.Home().string();
    Findings findings = CheckAccess("the state folder " + home, home);
    if (!findings.empty()) {
        return findings;
    }
    findings = CheckSpace(home);
    for (const char* name : {"", "run", "log", "tls", "lookhaven.db", "store"}) {
        const std::string path = *name == '\0' ? home : home + "/" + name;
        std::ranges::move(CheckPrivacy(path), std::back_inserter(findings));
    }
    return findings;
}

bool IsStateWritable(const base::Installation& installation) {
    const std::string home = installation.Home().string();
    const std::string database = home + "/lookhaven.db";
    return ::access(home.c_str(), R_OK | W_OK | X_OK) == 0 && CheckSpace(home).empty() &&
           (::access(database.c_str(), R_OK | W_OK) == 0 || errno == ENOENT);
}

}  // namespace lookhaven::doctor
