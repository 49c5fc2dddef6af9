// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/player_file.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <csignal>
#include <filesystem>
#include <string>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/base/io.h"

namespace lookhaven::control {

namespace {

constexpr const char* kFolder = "/tmp";
constexpr std::string_view kPrefix = "player_src.pid.";

// Empty for what is no session handle, and so should not become a path.
std::string PathOf(std::string_view session) {
    const bool is_handle = !session.empty() && session.find_first_not_of("0123456789abcdef") == session.npos;
    return is_handle ? std::string(kFolder) + '/' + std::string(kPrefix) + std::string(session) : "";
}

// Nothing when it is no regular file of this user under one name: the folder is open to every local user.
base::FileDescriptor OpenOwn(const std::string& path, int flags = O_RDONLY) {
    base::FileDescriptor file(::open(path.c_str(), flags | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, 0600));
    struct stat status {};
    const bool is_own = file && ::fstat(file.Get(), &status) == 0 && S_ISREG(status.st_mode) &&
                        status.st_uid == ::geteuid() && status.st_nlink <= 1;
    return is_own ? std::move(file) : base::FileDescriptor();
}

pid_t ProcessIn(const base::FileDescriptor& file) {
    std::array<char, 16> text{};
    const ssize_t length = file ? ::read(file.Get(), text.data(), text.size()) : 0;
    pid_t owner = 0;
    std::from_chars(text.data(), text.data() + std::max<ssize_t>(length, 0), owner);
    return owner;
}

}  // namespace

pid_t ReadPlayerFile(std::string_view session) {
    return ProcessIn(OpenOwn(PathOf(session)));
}

void WritePlayerFile(std::string_view session) {
    const std::string path = PathOf(session);
    errno = EACCES;  // unless opening says otherwise, it is another's
    const base::FileDescriptor file = OpenOwn(path, O_WRONLY | O_CREAT);
    // The line's end says where the number does, should two processes write at once.
    const std::string owner = std::to_string(::getpid()) + '\n';
    if (!file || ::ftruncate(file.Get(), 0) != 0 || !base::WriteAll(file.Get(), owner.data(), owner.size())) {
        base::ThrowErrno("cannot write " + path);
    }
}

void SweepPlayerFiles() {
    std::error_code error;
    // Not a range-based loop: that one would throw where the folder cannot be read to its end.
    for (auto at = std::filesystem::directory_iterator(kFolder, error); at != std::filesystem::directory_iterator();
         at.increment(error)) {
        const auto& entry = *at;
        if (!entry.path().filename().string().starts_with(kPrefix)) {
            continue;
        }
        const base::FileDescriptor file = OpenOwn(entry.path());
        const pid_t process = ProcessIn(file);
        if (file && (process <= 0 || ::kill(process, 0) != 0)) {
            ::unlink(entry.path().c_str());
        }
    }
}

void SweepPlayerFile(std::string_view session, pid_t process) {
    if (ReadPlayerFile(session) == process) {
        ::unlink(PathOf(session).c_str());
    }
}

}  // namespace lookhaven::control
