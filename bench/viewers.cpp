// SPDX-License-Identifier: Apache-2.0
//
// Plays many viewers of one live stream and prints, as one JSON object, how late the pictures arrived.
//
// A picture tells when it was made by a stamp that follows its first two bytes (see frame_stamp.h). It counts as
// received when its last byte has been read. The first two seconds do not count: processes start, and a stream of H.264
// begins with what has been since its last key frame.
#include <algorithm>
#include <array>
#include <cstdint>
#include <iostream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <sys/epoll.h>
#include <sys/socket.h>

#include "bench/connection.h"
#include "bench/part_reader.h"
#include "bench/percentile.h"
#include "standalone/base/clock.h"
#include "standalone/base/file_descriptor.h"

namespace {

using lookhaven::base::FileDescriptor;
using lookhaven::base::MonotonicMicros;

struct Viewer {
    FileDescriptor socket;
    bench::PartReader parts;
};

struct Options {
    bench::Target target;
    int viewers = 1;
    double seconds = 10;
};

Options Parse(int count, char** arguments) {
    Options options;
    for (int i = 1; i + 1 < count; i += 2) {
        const std::string_view name = arguments[i];
        const std::string value = arguments[i + 1];
        if (bench::TakeOption(options.target, std::string(name), value)) {
            continue;
        }
        if (name == "--viewers") {
            options.viewers = std::stoi(value);
        } else if (name == "--seconds") {
            options.seconds = std::stod(value);
        } else {
            throw std::invalid_argument("unknown option " + std::string(name));
        }
    }
    return options;
}

int Run(const Options& options) {
    const FileDescriptor poll(::epoll_create1(EPOLL_CLOEXEC));
    std::vector<Viewer> viewers(static_cast<std::size_t>(options.viewers));
    const std::string request = bench::Request(options.target);
    for (std::size_t i = 0; i < viewers.size(); ++i) {
        viewers[i].socket = bench::Connect(options.target);
        bench::Send(viewers[i].socket, request);
        epoll_event event{};
        event.events = EPOLLIN;
        event.data.u64 = i;
        ::epoll_ctl(poll.Get(), EPOLL_CTL_ADD, viewers[i].socket.Get(), &event);
    }
    std::vector<std::int64_t> latencies;
    std::int64_t bytes = 0;
    int ended = 0;
    std::vector<char> block(256 * 1024);
    std::int64_t start = MonotonicMicros();
    const std::int64_t settled = start + 2'000'000;
    const std::int64_t stop = start + static_cast<std::int64_t>(options.seconds * 1e6);
    std::array<epoll_event, 64> events{};
    while (MonotonicMicros() < stop && ended < options.viewers) {
        if (start < settled && MonotonicMicros() >= settled) {
            start = MonotonicMicros();
            bytes = 0;
            latencies.clear();
        }
        const int ready = ::epoll_wait(poll.Get(), events.data(), static_cast<int>(events.size()), 100);
        for (int i = 0; i < ready; ++i) {
            Viewer& viewer = viewers[events[static_cast<std::size_t>(i)].data.u64];
            const ssize_t got = ::recv(viewer.socket.Get(), block.data(), block.size(), MSG_DONTWAIT);
            if (got > 0) {
                bytes += got;
                viewer.parts.Feed(block.data(), static_cast<std::size_t>(got), latencies);
            } else if (got == 0) {
                viewer.socket.Reset();
                ++ended;
            }
        }
    }
    std::sort(latencies.begin(), latencies.end());
    std::cout << "{\"pictures\":" << latencies.size() << ",\"bytes\":" << bytes << ",\"ended\":" << ended
              << ",\"seconds\":" << static_cast<double>(MonotonicMicros() - start) / 1e6
              << ",\"p50_micros\":" << bench::Percentile(latencies, 0.5)
              << ",\"p99_micros\":" << bench::Percentile(latencies, 0.99)
              << ",\"longest_micros\":" << bench::Percentile(latencies, 1) << "}\n";
    return 0;
}

}  // namespace

int main(int count, char** arguments) try { return Run(Parse(count, arguments)); } catch (const std::exception& error) {
    std::cerr << "bench_viewers: " << error.what() << '\n';
    return 1;
}
