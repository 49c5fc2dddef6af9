// SPDX-License-Identifier: Apache-2.0
//
// How marks are stored, and how they are searched for words. For this folder's sources.
#pragma once

#include <algorithm>
#include <optional>
#include <vector>

#include "standalone/store/marks.h"
#include "standalone/store/query.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/row_search.h"

namespace lookhaven::store {

template <>
struct Mapping<Mark> {
    static constexpr const char* kTable = "marks";
    static constexpr const char* kColumns =
        "id, kind, camera_id, moment_s, start_s, end_s, text, state, mount_id, path, demo, reporter_id, reporter,"
        " reported_s";
    static auto Members(auto& mark) {
        return std::tie(mark.id, mark.kind, mark.camera_id, mark.moment_s, mark.start_s, mark.end_s, mark.text,
                        mark.state, mark.mount_id, mark.path, mark.demo, mark.reporter.user_id, mark.reporter.name,
                        mark.reported_s);
    }
};

constexpr std::int64_t kMaxFootageSeconds = kMaxMarkSeconds + 2 * kMaxAroundMarkSeconds;
constexpr std::int64_t kLastMoment = std::numeric_limits<int>::max();  // clients count in 31 bits

// 0 for any.
inline int NumberOf(std::optional<MarkKind> kind) {
    return kind ? static_cast<int>(*kind) : 0;
}

// The starts to search: what starts earlier cannot reach into the filter's span.
inline StartSpan StartsOf(const MarkFilter& filter) {
    return {std::max(filter.begin_s, kMaxFootageSeconds) - kMaxFootageSeconds, filter.end_s};
}

// Marks::List for a filter with words.
std::vector<Mark> FindMarksByWords(Connection& connection, const MarkFilter& filter);

}  // namespace lookhaven::store
