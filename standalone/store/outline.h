// SPDX-License-Identifier: Apache-2.0
//
// What was recorded and reported of a camera in a span of time, no finer than a step: what a timeline of weeks shows.
//
// Why so        Three months of a camera are ten thousand events and more, of which a screen shows no more than it has
//               pixels. So what is smaller than two steps is joined where less than a step lies between, and the answer
//               has a few entries for each step, however much there is.
#pragma once

#include <cstdint>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

struct Bar {
    std::int64_t start_s = 0;
    std::int64_t end_s = 0;

    friend bool operator==(const Bar&, const Bar&) = default;
};

// Joins the bars of events, which are added in the order of their starts.
class JoinedBars {
  public:
    // step_s: at least 1.
    explicit JoinedBars(std::int64_t step_s) : step_s_(step_s) {}

    void Add(const Bar& bar);
    std::vector<Bar> Take() { return std::move(bars_); }

  private:
    bool IsShort(const Bar& bar) const { return bar.end_s - bar.start_s < 2 * step_s_; }

    std::int64_t step_s_;
    std::vector<Bar> bars_;
    bool is_joined_ = false;  // the last bar was joined from short ones
};

struct Outline {
    std::vector<Bar> continuous;             // events recorded all the time …
    std::vector<Bar> alarm;                  // … and for any other reason
    std::vector<std::int64_t> alerts;        // when they happened, in seconds; at most one for each step
    std::vector<std::int64_t> transactions;  // of POS terminals, likewise

    bool IsEmpty() const { return continuous.empty() && alarm.empty() && alerts.empty() && transactions.empty(); }
};

// The outline of the events and marks that touch the span from begin_s up to, not including, end_s. step_s: at least
// 1. Reads each of them once, in the order of an index: a tenth of a second for a hundred thousand.
Outline OutlineOf(Store& store, int camera_id, std::int64_t begin_s, std::int64_t end_s, std::int64_t step_s);

}  // namespace lookhaven::store
