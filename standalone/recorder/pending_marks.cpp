// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/pending_marks.h"

#include <algorithm>
#include <utility>

namespace lookhaven::recorder {

namespace {

// What the pre-record buffer holds may belong to marks that become known sooner than this after their end.
constexpr std::int64_t kMaxLateMarkS = 10;
// From when a mark becomes known its camera is recorded for so long at least: the camera's thread is told up to a
// second later, and may have to try again.
constexpr std::int64_t kMinRecordingS = 4;

std::int64_t RecordUntil(const store::Mark& mark, std::int64_t now_s) {
    const bool may_be_buffered = now_s < mark.end_s + kMaxLateMarkS;
    return may_be_buffered ? std::max(mark.end_s, now_s + kMinRecordingS) : mark.end_s;
}

}  // namespace

PendingMarks UpdatePendingMarks(std::vector<store::Mark> marks, const PendingMarks& known, std::int64_t now_s) {
    PendingMarks pending;
    for (store::Mark& mark : marks) {
        const auto before = known.find(mark.id);
        const std::int64_t until_s = before == known.end() ? RecordUntil(mark, now_s) : before->second.record_until_s;
        const int id = mark.id;
        pending.emplace(id, PendingMark{std::move(mark), until_s});
    }
    return pending;
}

}  // namespace lookhaven::recorder
