// SPDX-License-Identifier: Apache-2.0
//
// The marks whose footage is still to come, and until when their cameras are recorded for them.
//
// Why so        A mark may become known when its span is nearly or wholly over: a POS terminal or the store was slow.
//               What the camera sent is in its pre-record buffer then, which holds some seconds more than the plan
//               asks for (event_segmenter.cpp): a recording that begins late still begins with it.
#pragma once

#include <cstdint>
#include <map>
#include <vector>

#include "standalone/store/marks.h"

namespace lookhaven::recorder {

struct PendingMark {
    store::Mark mark;
    // In UTC seconds: the mark's end, or some seconds after it became known where that was late.
    std::int64_t record_until_s = 0;
};

// By id.
using PendingMarks = std::map<int, PendingMark>;

// These marks are pending at now_s (UTC). One that is among those known before keeps its time.
PendingMarks UpdatePendingMarks(std::vector<store::Mark> marks, const PendingMarks& known, std::int64_t now_s);

}  // namespace lookhaven::recorder
