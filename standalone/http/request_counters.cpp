// SPDX-License-Identifier: Apache-2.0
#include "standalone/http/request_counters.h"

#include <algorithm>

namespace lookhaven::http {

RequestCounters::Call& RequestCounters::Find(std::string_view call) {
    if (const auto known = calls_.find(call); known != calls_.end()) {
        return known->second;
    }
    return calls_[calls_.size() < kMaxCalls ? std::string(call) : std::string()];
}

void RequestCounters::NoteServed(std::string_view call, int status, bool is_stream, std::chrono::microseconds took) {
    Call& counted = Find(call);
    ++counted.by_status[status >= 100 && status <= 599 ? status : 0];
    if (!is_stream) {
        const double took_s = std::chrono::duration<double>(took).count();
        const auto bucket = std::ranges::lower_bound(kBounds, took_s) - kBounds.begin();
        ++counted.durations.counts[static_cast<std::size_t>(bucket)];
        counted.durations.sum_s += took_s;
    }
}

}  // namespace lookhaven::http
