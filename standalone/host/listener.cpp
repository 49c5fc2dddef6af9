// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/listener.h"

#include <cstdlib>
#include <stdexcept>

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include "standalone/base/file.h"

namespace lookhaven::host {

namespace {

constexpr int kFirstPassedDescriptor = 3;  // of those that a service manager opens for a service
constexpr int kBacklog = 512;

bool IsSocketPassed() {
    const char* pid = std::getenv("LISTEN_PID");
    const char* count = std::getenv("LISTEN_FDS");
    return pid != nullptr && count != nullptr && std::to_string(::getpid()) == pid && std::string("1") == count;
}

sockaddr_un Address(const std::filesystem::path& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.string().size() >= sizeof address.sun_path) {
        throw std::runtime_error("the socket's path is too long: " + path.string());
    }
    path.string().copy(address.sun_path, sizeof address.sun_path - 1);
    return address;
}

base::FileDescriptor NewSocket() {
    return base::FileDescriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
}

std::optional<std::pair<dev_t, ino_t>> FileAt(const std::filesystem::path& path) {
    struct stat status {};
    return ::lstat(path.c_str(), &status) == 0 ? std::optional(std::pair(status.st_dev, status.st_ino)) : std::nullopt;
}

}  // namespace

void OpenStandardDescriptors() {
    for (int opened = 0; opened <= STDERR_FILENO;) {
        opened = ::open("/dev/null", O_RDWR);
        if (opened > STDERR_FILENO || opened < 0) {
            ::close(opened);
            return;
        }
    }
}

Listener::Listener(const std::filesystem::path& path) {
    if (IsSocketPassed()) {
        socket_.Reset(kFirstPassedDescriptor);
        ::fcntl(kFirstPassedDescriptor, F_SETFD, FD_CLOEXEC);
        ::fcntl(kFirstPassedDescriptor, F_SETFL, O_NONBLOCK);
        return;
    }
    const sockaddr_un address = Address(path);
    const auto* generic = reinterpret_cast<const sockaddr*>(&address);
    if (::connect(NewSocket().Get(), generic, sizeof address) == 0 || errno == EAGAIN) {
        throw std::runtime_error("another lookhaven-webapi already listens on " + path.string());
    }
    ::unlink(path.c_str());
    socket_ = NewSocket();
    const mode_t mask = ::umask(0117);
    const int bound = ::bind(socket_.Get(), generic, sizeof address);
    ::umask(mask);
    if (bound != 0 || ::listen(socket_.Get(), kBacklog) != 0) {
        base::ThrowErrno("cannot listen on " + path.string());
    }
    path_ = path;
    file_ = FileAt(path);
}

// The file goes first: as long as the socket is open, no other file gets the number by which this one is known.
void Listener::Close() {
    if (socket_ && file_ && FileAt(path_) == file_) {
        ::unlink(path_.c_str());
    }
    socket_.Reset();
}

}  // namespace lookhaven::host
