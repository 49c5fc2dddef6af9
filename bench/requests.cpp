// SPDX-License-Identifier: Apache-2.0
//
// Asks one JSON question again and again from several clients and prints rate and times as one JSON object.
#include <algorithm>
#include <array>
#include <chrono>
#include <cstdint>
#include <iostream>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "bench/connection.h"
#include "bench/percentile.h"
#include "standalone/base/clock.h"

namespace {

using lookhaven::base::MonotonicMicros;

struct Tally {
    std::vector<std::int64_t> micros;
    int refused = 0;
};

// One request on a connection of its own; true when the answer is a success.
bool Ask(const bench::Target& target, const std::string& request) {
    const auto socket = bench::Connect(target);
    bench::Send(socket, request);
    std::string answer;
    std::array<char, 65536> block{};
    for (;;) {
        const ssize_t got = ::recv(socket.Get(), block.data(), block.size(), 0);
        if (got <= 0) {
            return answer.find("\"success\":true") != std::string::npos;
        }
        answer.append(block.data(), static_cast<std::size_t>(got));
    }
}

Tally RunClient(const bench::Target& target, std::int64_t stop_micros, std::chrono::milliseconds pause) {
    Tally tally;
    const std::string request = bench::Request(target);
    for (std::int64_t start = MonotonicMicros(); start < stop_micros; start = MonotonicMicros()) {
        if (Ask(target, request)) {
            tally.micros.push_back(MonotonicMicros() - start);
        } else {
            ++tally.refused;
        }
        std::this_thread::sleep_for(pause);
    }
    return tally;
}

int Run(int count, char** arguments) {
    bench::Target target;
    std::size_t clients = 1;
    double seconds = 5;
    std::chrono::milliseconds pause{0};  // of each client between two requests
    for (int i = 1; i + 1 < count; i += 2) {
        const std::string name = arguments[i];
        const std::string value = arguments[i + 1];
        if (name == "--clients") {
            clients = std::stoul(value);
        } else if (name == "--seconds") {
            seconds = std::stod(value);
        } else if (name == "--pause-ms") {
            pause = std::chrono::milliseconds(std::stol(value));
        } else if (!bench::TakeOption(target, name, value)) {
            throw std::invalid_argument("unknown option " + name);
        }
    }
    const std::int64_t start = MonotonicMicros();
    std::vector<Tally> tallies(clients);
    {
        std::vector<std::jthread> threads;
        for (Tally& tally : tallies) {
            threads.emplace_back([&tally, &target, start, seconds, pause] {
                tally = RunClient(target, start + static_cast<std::int64_t>(seconds * 1e6), pause);
            });
        }
    }
    const double elapsed = static_cast<double>(MonotonicMicros() - start) / 1e6;
    Tally all;
    for (const Tally& tally : tallies) {
        all.micros.insert(all.micros.end(), tally.micros.begin(), tally.micros.end());
        all.refused += tally.refused;
    }
    std::sort(all.micros.begin(), all.micros.end());
    std::cout << "{\"answers\":" << all.micros.size() << ",\"refused\":" << all.refused
              << ",\"per_second\":" << static_cast<double>(all.micros.size()) / elapsed
              << ",\"p50_micros\":" << bench::Percentile(all.micros, 0.5)
              << ",\"p99_micros\":" << bench::Percentile(all.micros, 0.99) << "}\n";
    return 0;
}

}  // namespace

int main(int count, char** arguments) try { return Run(count, arguments); } catch (const std::exception& error) {
    std::cerr << "bench_requests: " << error.what() << '\n';
    return 1;
}
