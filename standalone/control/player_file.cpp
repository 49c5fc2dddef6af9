// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/player_file.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <string>

#include <fcntl.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::control {

namespace {

// Empty for what is no session handle, and so should not become a path.
std::string PathOf(std::string_view session) {
    const bool is_handle = !session.empty() && session.find_first_not_of("0123456789abcdef") == session.npos;
    return is_handle ? "/tmp/player_src.pid." + std::string(session) : "";
}

}  // namespace

pid_t ReadPlayerFile(std::string_view session) {
    const base::FileDescriptor file(::open(PathOf(session).c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    std::array<char, 16> text{};
    const ssize_t length = file ? ::read(file.Get(), text.data(), text.size()) : 0;
    pid_t owner = 0;
    std::from_chars(text.data(), text.data() + std::max<ssize_t>(length, 0), owner);
    return owner;
}

void SweepPlayerFile(std::string_view session, pid_t process) {
    if (ReadPlayerFile(session) == process) {
        ::unlink(PathOf(session).c_str());
    }
}

}  // namespace lookhaven::control
