// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/process.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/file_descriptor.h"

namespace lookhaven::base {

std::uint64_t ProcessStartTicks(pid_t pid) {
    std::array<char, 64> path{};
    // Its first thread's: /proc/PID/stat says the same, but qemu-user answers a process that asks for its own by
    // itself.
    std::snprintf(path.data(), path.size(), "/proc/%d/task/%d/stat", static_cast<int>(pid), static_cast<int>(pid));
    const FileDescriptor file(::open(path.data(), O_RDONLY | O_CLOEXEC));
    if (!file) {
        return errno == ENOENT ? 0 : kUnknownStart;
    }
    std::array<char, 1024> text{};
    const ssize_t length = ::read(file.Get(), text.data(), text.size() - 1);
    if (length <= 0) {
        return length < 0 && errno == ESRCH ? 0 : kUnknownStart;
    }
    // The command name in parentheses may hold anything, so the fields are counted from its last parenthesis.
    const char* field = std::strrchr(text.data(), ')');
    if (field != nullptr && field[1] == ' ' && (field[2] == 'Z' || field[2] == 'X')) {
        return 0;
    }
    // State is field 3 and the start time field 22.
    for (int number = 2; field != nullptr && number < 22; ++number) {
        field = std::strchr(field + 1, ' ');
    }
    return field == nullptr ? kUnknownStart : std::strtoull(field + 1, nullptr, 10);
}

ProcessIdentity ThisProcess() {
    const std::uint64_t start_ticks = ProcessStartTicks(getpid());
    if (start_ticks == 0 || start_ticks == kUnknownStart) {
        throw std::runtime_error("cannot read this process's start time from /proc");
    }
    return {static_cast<std::int32_t>(getpid()), start_ticks};
}

bool IsAlive(const ProcessIdentity& process) {
    if (process.pid <= 0 || process.start_ticks == 0) {
        return false;
    }
    const std::uint64_t start_ticks = ProcessStartTicks(process.pid);
    return start_ticks == process.start_ticks || start_ticks == kUnknownStart;
}

std::int64_t StartedAt(const ProcessIdentity& process) {
    const long ticks_per_second = ::sysconf(_SC_CLK_TCK);
    if (process.start_ticks == 0 || process.start_ticks == kUnknownStart || ticks_per_second <= 0) {
        return 0;
    }
    const auto started_s =
        static_cast<std::int64_t>(process.start_ticks / static_cast<std::uint64_t>(ticks_per_second));
    return WallSeconds() - TimeSinceBoot().seconds + started_s;
}

bool IsProgramReplaced(pid_t pid) {
    constexpr std::string_view kMark = " (deleted)";
    std::array<char, 4096> path{};
    const ssize_t length = ::readlink(("/proc/" + std::to_string(pid) + "/exe").c_str(), path.data(), path.size());
    return length > 0 && std::string_view(path.data(), static_cast<std::size_t>(length)).ends_with(kMark);
}

void RaiseDescriptorLimit() {
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) == 0) {
        limit.rlim_cur = limit.rlim_max;
        ::setrlimit(RLIMIT_NOFILE, &limit);
    }
}

void CloseFrom(int first) {
    if (::close_range(static_cast<unsigned int>(first), ~0U, 0) == 0) {
        return;
    }
    // Older kernels, and filters of system calls, refuse close_range; there may be a thousand million numbers to try
    // then, so it looks which are open.
    std::vector<int> open;
    std::error_code error;
    for (auto at = std::filesystem::directory_iterator("/proc/self/fd", error);
         at != std::filesystem::directory_iterator(); at.increment(error)) {
        open.push_back(std::atoi(at->path().filename().c_str()));
    }
    for (const int descriptor : open) {
        if (descriptor >= first) {
            ::close(descriptor);
        }
    }
}

void PreferAsOomVictim() {
    const FileDescriptor file(::open("/proc/self/oom_score_adj", O_WRONLY | O_CLOEXEC));
    [[maybe_unused]] const ssize_t written = file ? ::write(file.Get(), "500", 3) : 0;
}

}  // namespace lookhaven::base
