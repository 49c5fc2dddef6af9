// SPDX-License-Identifier: Apache-2.0
//
// Counts the requests that the host has served, and how long they took.
//
// Why so        Only the host sees how each request ends, that of a crash too. A request process that is to tell the
//               counts has a copy of them: that of the moment when it was forked.
#pragma once

#include <array>
#include <chrono>
#include <cstdint>
#include <map>
#include <string>
#include <string_view>

namespace lookhaven::http {

class RequestCounters {
  public:
    // Upper bounds of the histogram's buckets, in seconds; the last one has none.
    static constexpr std::array kBounds{0.001, 0.0025, 0.005, 0.01, 0.025, 0.05, 0.1, 0.25, 0.5, 1.0, 2.5, 5.0, 10.0};
    // How many different calls are counted separately.
    static constexpr std::size_t kMaxCalls = 256;

    struct Durations {
        std::array<std::uint64_t, kBounds.size() + 1> counts{};  // each bucket by itself
        double sum_s = 0;
    };
    struct Call {
        std::map<int, std::uint64_t> by_status;  // status 0: the process died
        Durations durations;                     // of those that were no streams
    };

    // call: "VEXO.Event/List", or empty for what named none. It comes from a process that may have been taken over:
    // beyond kMaxCalls names, and for what is no status, nothing new is told apart.
    void NoteServed(std::string_view call, int status, bool is_stream, std::chrono::microseconds took);
    // Counts a request that the host refused without a process.
    void NoteRefused(int status) { ++refused_[status]; }

    const std::map<std::string, Call, std::less<>>& Calls() const { return calls_; }
    const std::map<int, std::uint64_t>& Refused() const { return refused_; }

  private:
    Call& Find(std::string_view call);

    std::map<std::string, Call, std::less<>> calls_;
    std::map<int, std::uint64_t> refused_;
};

}  // namespace lookhaven::http
