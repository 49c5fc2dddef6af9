// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/process.h"

#include <array>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::base {

std::uint64_t ProcessStartTicks(pid_t pid) {
    std::array<char, 64> path{};
    std::snprintf(path.data(), path.size(), "/proc/%d/stat", static_cast<int>(pid));
    const FileDescriptor file(::open(path.data(), O_RDONLY | O_CLOEXEC));
    if (!file) {
        return 0;
    }
    std::array<char, 1024> text{};
    const ssize_t length = ::read(file.Get(), text.data(), text.size() - 1);
    // The command name in parentheses may hold anything, so the fields are counted from its last parenthesis.
    const char* field = length > 0 ? std::strrchr(text.data(), ')') : nullptr;
    if (field == nullptr || field[1] == '\0' || field[2] == 'Z' || field[2] == 'X') {
        return 0;
    }
    // State is field 3 and the start time field 22.
    for (int number = 2; field != nullptr && number < 22; ++number) {
        field = std::strchr(field + 1, ' ');
    }
    return field == nullptr ? 0 : std::strtoull(field + 1, nullptr, 10);
}

ProcessIdentity ThisProcess() {
    return {static_cast<std::int32_t>(getpid()), ProcessStartTicks(getpid())};
}

bool IsAlive(const ProcessIdentity& process) {
    return process.pid > 0 && process.start_ticks != 0 && ProcessStartTicks(process.pid) == process.start_ticks;
}

}  // namespace lookhaven::base
