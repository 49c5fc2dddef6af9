// SPDX-License-Identifier: Apache-2.0
//
// Random questions about events and marks, and the answers that a look at every single one gives.
#pragma once

#include <algorithm>
#include <limits>
#include <optional>
#include <random>
#include <vector>

#include "standalone/store/events.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {

inline constexpr std::int64_t kDay = 4'000'000'000;  // beyond 31 bits
inline constexpr std::int64_t kNever = std::numeric_limits<std::int64_t>::max();

template <typename Record>
std::vector<int> Ids(const std::vector<Record>& records) {
    std::vector<int> ids;
    std::ranges::transform(records, std::back_inserter(ids), &Record::id);
    return ids;
}

// What a look at every record gives: those that pass, by start and id, then the slice.
template <typename Record, typename Filter, typename Passes>
std::vector<Record> Naive(std::vector<Record> records, const Filter& filter, Passes passes) {
    std::erase_if(records, [&](const Record& record) {
        return !filter.camera_ids.contains(record.camera_id) || record.start_s >= filter.end_s ||
               record.end_s <= filter.begin_s || !passes(record);
    });
    const auto key = [](const Record& record) { return std::pair(record.start_s, record.id); };
    std::ranges::sort(records, {}, key);
    if (filter.newest_first) {
        std::ranges::reverse(records);
    }
    const auto first = std::min(records.size(), static_cast<std::size_t>(filter.offset));
    const auto count = std::min(records.size() - first, static_cast<std::size_t>(filter.limit));
    return {records.begin() + static_cast<std::ptrdiff_t>(first),
            records.begin() + static_cast<std::ptrdiff_t>(first + count)};
}

class RandomRecords : public StoreTest {
  protected:
    int Draw(int first, int last) { return std::uniform_int_distribution(first, last)(random_); }

    template <typename Filter>
    Filter RandomSpan(std::int64_t first_s) {
        Filter filter;
        for (int cameras = Draw(0, 4); cameras > 0; --cameras) {
            filter.camera_ids.insert(Draw(0, 6));
        }
        if (Draw(0, 4) != 0) {
            const std::int64_t begin_s = first_s + Draw(-10, 400) * 60;
            filter.begin_s = Draw(0, 9) == 0 ? -kNever - 1 : begin_s;
            filter.end_s = Draw(0, 9) == 0 ? kNever : begin_s + Draw(-5, 100) * 60;
        }
        filter.newest_first = Draw(0, 2) == 0;
        filter.offset = Draw(0, 2) == 0 ? Draw(0, 20) : 0;
        filter.limit = Draw(0, 1) == 0 ? Draw(0, 20) : filter.limit;
        return filter;
    }

    Step RandomStep(std::int64_t first_s) {
        Step step{RandomSpan<EventFilter>(first_s).camera_ids};
        step.start_s = first_s + Draw(-1, 41) * 600;
        step.id = Draw(0, 400);
        step.backwards = Draw(0, 1) == 0;
        return step;
    }

    // The nearest of those that pass.
    template <typename Record, typename Passes>
    static std::optional<Record> NaiveNext(const std::vector<Record>& records, const Step& step, Passes passes) {
        std::optional<Record> next;
        for (const Record& record : records) {
            if (step.camera_ids.contains(record.camera_id) && !record.demo && passes(record) &&
                step.IsNearer(step, record) && (!next || step.IsNearer(record, *next))) {
                next = record;
            }
        }
        return next;
    }

  private:
    std::mt19937 random_{19528};
};

}  // namespace lookhaven::store
