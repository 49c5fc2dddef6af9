// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/confinement.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>
#include <system_error>

#include <fcntl.h>
#include <linux/landlock.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/base/process.h"
#include "standalone/base/sanitizers.h"
#include "standalone/camera/camera_system_calls.h"

namespace lookhaven::camera {

namespace {

// What the C library reads to resolve a name, and what the TLS library reads at its start; a camera's certificate is
// not verified.
constexpr const char* kReadable[] = {
    "/etc/gai.conf",
    "/etc/host.conf",
    "/etc/hosts",
    "/etc/nsswitch.conf",
    "/etc/resolv.conf",
    "/etc/ssl/certs",
    "/usr/share/ca-certificates",
    "/usr/local/share/ca-certificates",
};

[[noreturn]] void Fail(const char* what) {
    throw std::system_error(errno, std::generic_category(), what);
}

void Limit(decltype(RLIMIT_AS) resource, rlim_t most) {
    rlimit limit{};
    if (::getrlimit(resource, &limit) != 0) {
        Fail("cannot read a limit of this process");
    }
    limit.rlim_max = std::min(limit.rlim_max, most);
    limit.rlim_cur = limit.rlim_max;
    if (::setrlimit(resource, &limit) != 0) {
        Fail("cannot limit this process");
    }
}

void LimitResources() {
    constexpr rlim_t kMaxAddressSpaceBytes = rlim_t{512} << 20;
    if (!base::kSanitized) {  // a sanitizer reserves terabytes, and writes its report to a file
        Limit(RLIMIT_AS, kMaxAddressSpaceBytes);
        Limit(RLIMIT_FSIZE, 0);
    }
    Limit(RLIMIT_NOFILE, 16);
    Limit(RLIMIT_NPROC, 0);
    Limit(RLIMIT_CORE, 0);  // it would hold the camera's password
}

// All rights over files that the version knows; it must refuse each, or that one would stay free.
std::uint64_t RightsOfVersion(long version) {
    constexpr std::array kCounts{13, 14, 15, 15, 16};
    const auto row = static_cast<std::size_t>(std::min<long>(version, kCounts.size()) - 1);
    return (std::uint64_t{1} << kCounts[row]) - 1;
}

void MakeReadable(int rules, const char* path) {
    const base::FileDescriptor file(::open(path, O_PATH | O_CLOEXEC));
    struct stat status {};
    if (!file || ::fstat(file.Get(), &status) != 0) {
        return;  // the C library does without it too
    }
    landlock_path_beneath_attr rule{};
    rule.allowed_access = LANDLOCK_ACCESS_FS_READ_FILE | (S_ISDIR(status.st_mode) ? LANDLOCK_ACCESS_FS_READ_DIR : 0);
    rule.parent_fd = file.Get();
    if (::syscall(SYS_landlock_add_rule, rules, LANDLOCK_RULE_PATH_BENEATH, &rule, 0) != 0) {
        Fail("cannot add a Landlock rule");
    }
}

bool ConfineFiles() {
    const long version = ::syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION);
    if (version <= 0) {
        return false;
    }
    landlock_ruleset_attr attributes{};
    attributes.handled_access_fs = RightsOfVersion(version);
    const base::FileDescriptor rules(
        static_cast<int>(::syscall(SYS_landlock_create_ruleset, &attributes, sizeof attributes, 0)));
    if (!rules) {
        Fail("cannot make Landlock rules");
    }
    for (const char* path : kReadable) {
        MakeReadable(rules.Get(), path);
    }
    if (base::kSanitized) {
        MakeReadable(rules.Get(), "/proc/self");  // for reports
    }
    if (::syscall(SYS_landlock_restrict_self, rules.Get(), 0) != 0) {
        Fail("cannot apply Landlock rules");
    }
    return true;
}

}  // namespace

Confinement ConfineThisProcess() {
    if (::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0 || ::prctl(PR_SET_DUMPABLE, 0, 0, 0, 0) != 0) {
        Fail("cannot give up privileges");
    }
    base::PreferAsOomVictim();
    LimitResources();
    Confinement confinement;
    confinement.has_landlock = ConfineFiles();
    confinement.has_system_call_filter = FilterSystemCalls();
    return confinement;
}

}  // namespace lookhaven::camera
