// SPDX-License-Identifier: Apache-2.0
//
// The least that can be done: one process per viewer that writes the same pictures from its memory to a unix socket.
//
// What the real server costs is measured against this, in the same run on the same machine. Arguments: socket path,
// bytes of a picture, pictures a second.
#include <algorithm>
#include <array>
#include <atomic>
#include <climits>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <string>

#include <linux/futex.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include "bench/frame_stamp.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"

namespace {

using lookhaven::base::FileDescriptor;

struct Tick {
    std::atomic<std::uint32_t> number;
    std::atomic<std::int64_t> made_micros;
};

long Futex(std::atomic<std::uint32_t>& word, int operation, std::uint32_t value) {
    return syscall(SYS_futex, &word, operation, value, nullptr, nullptr, 0);
}

// Writes every picture until the viewer leaves.
[[noreturn]] void Serve(int viewer, Tick& tick, std::vector<char>& frame) {
    const std::string head =
        "--frame\r\nContent-Type: image/jpeg\r\nContent-Length: " + std::to_string(frame.size()) + "\r\n\r\n";
    const std::string preamble = "Content-Type: multipart/x-mixed-replace; boundary=frame\r\n\r\n";
    if (::write(viewer, preamble.data(), preamble.size()) < 0) {
        _exit(1);
    }
    for (std::uint32_t seen = tick.number;;) {
        Futex(tick.number, FUTEX_WAIT, seen);
        if (tick.number == seen) {
            continue;
        }
        seen = tick.number;
        bench::WriteStamp(frame.data(), tick.made_micros);
        std::array<iovec, 3> pieces{{{const_cast<char*>(head.data()), head.size()},
                                     {frame.data(), frame.size()},
                                     {const_cast<char*>("\r\n"), 2}}};
        std::size_t first = 0;
        while (first < pieces.size()) {
            ssize_t written = ::writev(viewer, &pieces[first], static_cast<int>(pieces.size() - first));
            if (written <= 0) {
                _exit(0);
            }
            while (first < pieces.size() && static_cast<std::size_t>(written) >= pieces[first].iov_len) {
                written -= static_cast<ssize_t>(pieces[first++].iov_len);
            }
            if (first < pieces.size()) {
                pieces[first].iov_base = static_cast<char*>(pieces[first].iov_base) + written;
                pieces[first].iov_len -= static_cast<std::size_t>(written);
            }
        }
    }
}

[[noreturn]] void KeepTime(Tick& tick, long period_nanos) {
    timespec next{};
    clock_gettime(CLOCK_MONOTONIC, &next);
    for (;;) {
        next.tv_nsec += period_nanos;
        next.tv_sec += next.tv_nsec / 1'000'000'000;
        next.tv_nsec %= 1'000'000'000;
        clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &next, nullptr);
        tick.made_micros = lookhaven::base::MonotonicMicros();
        ++tick.number;
        Futex(tick.number, FUTEX_WAKE, INT_MAX);
    }
}

int Run(const char* path, std::size_t frame_bytes, long frames_per_second) {
    void* shared = ::mmap(nullptr, sizeof(Tick), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    Tick& tick = *new (shared) Tick{};
    std::vector<char> frame = bench::MakeFrame(frame_bytes);
    const FileDescriptor listener(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::string_view(path).copy(address.sun_path, sizeof address.sun_path - 1);
    if (::bind(listener.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        ::listen(listener.Get(), 128) != 0) {
        lookhaven::base::ThrowErrno(path);
    }
    std::signal(SIGCHLD, SIG_IGN);
    std::signal(SIGPIPE, SIG_IGN);
    const auto start_child = [] {
        const pid_t child = ::fork();
        if (child == 0) {
            ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        }
        return child == 0;
    };
    if (start_child()) {
        KeepTime(tick, 1'000'000'000 / frames_per_second);
    }
    for (;;) {
        const FileDescriptor viewer(::accept(listener.Get(), nullptr, nullptr));
        if (viewer && start_child()) {
            std::array<char, 8192> request{};
            if (::read(viewer.Get(), request.data(), request.size()) <= 0) {
                _exit(1);
            }
            Serve(viewer.Get(), tick, frame);
        }
    }
}

}  // namespace

int main(int count, char** arguments) try {
    if (count != 4) {
        std::cerr << "usage: bench_bare_server SOCKET FRAME_BYTES FRAMES_PER_SECOND\n";
        return 64;
    }
    return Run(arguments[1], std::strtoull(arguments[2], nullptr, 10), std::strtol(arguments[3], nullptr, 10));
} catch (const std::exception& error) {
    std::cerr << "bench_bare_server: " << error.what() << '\n';
    return 1;
}
