// SPDX-License-Identifier: Apache-2.0
//
// Recording plans: when a camera is recorded, in what pieces, and where to.
#pragma once

#include <cstdint>
#include <map>
#include <string>

#include "standalone/store/store.h"

namespace lookhaven::store {

// The numbers are stored. With kNever a camera is still recorded around its marks. kSchedule: see RecordingPlan::hours.
enum class RecordMode : int { kNever = 0, kAlways = 1, kSchedule = 2 };

// What is recorded in an hour of the week; the letters are stored.
enum class HourMode : char { kNever = '0', kAlways = '1', kAroundMarks = '2' };

constexpr int kMinSegmentSeconds = 10;
constexpr int kMaxSegmentSeconds = 3600;
constexpr int kMaxAroundMarkSeconds = 300;

// A camera's first plan begins as this.
struct RecordingPlan {
    RecordMode mode = RecordMode::kNever;
    int segment_s = 300;  // kMinSegmentSeconds … kMaxSegmentSeconds
    int pre_s = 5;        // before a mark and after it, 0 … kMaxAroundMarkSeconds
    int post_s = 10;
    int mount_id = 0;  // 0: the default mount
    int profile = 0;   // which of the camera's profiles; one that it lacks means the live profile
    // An HourMode for each hour of the week, as base::LocalHourOfWeek counts them; empty: kAroundMarks for all. Kept,
    // but not followed, in other modes than kSchedule.
    std::string hours = {};

    HourMode At(std::int64_t time_s) const;

    friend bool operator==(const RecordingPlan&, const RecordingPlan&) = default;
};

// What holds for a camera without a plan of its own: it is recorded around its marks, but not before them, for which
// its stream would have to run all the time.
inline RecordingPlan NoPlan() {
    return {.pre_s = 0};
}

// What the mode and the hours of a plan say of that hour of the week.
HourMode ModeOfHour(RecordMode mode, const std::string& hours, int hour_of_week);

class RecordingPlans {
  public:
    // The store must outlive this object.
    explicit RecordingPlans(Store& store) : connection_(store.connection()) {}

    // Raises Settings::Revision(). Throws InvalidRecord, or NotFound for an unknown camera or mount.
    void Set(int camera_id, const RecordingPlan& plan);
    RecordingPlan Find(int camera_id);  // NoPlan() where the camera has none
    // By camera, those without a plan of their own left out.
    std::map<int, RecordingPlan> List();

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
