// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/event_segmenter.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <utility>

#include "standalone/base/log.h"
#include "standalone/maintenance/mount_folder.h"

namespace lookhaven::recorder {

namespace {

using maintenance::RecordingState;

constexpr std::int64_t kFlushUs = 500'000;
constexpr std::int64_t kMountCheckUs = 1'000'000;
constexpr std::int64_t kRetryUs = 1'000'000;
// Until the recorder knows of a mark, or has an id for the event: it asks the store once a second, which may be slow.
constexpr int kMaxWaitSeconds = 5;
// Events that begin for a camera's times alone: so many in a row, and then one in each interval.
constexpr std::int64_t kMaxCutBurst = 8;
constexpr std::int64_t kCutIntervalUs = 10'000'000;
constexpr std::int64_t kMaxIntervalUs = 30'000'000;  // between pictures; a longer gap means that the camera was lost
// Events that the disk did not let finish are tried again for so long. Their files are open meanwhile, so that a disk
// that stays broken could not be unmounted.
constexpr std::int64_t kFinishTimeoutUs = 60'000'000;
constexpr std::size_t kMaxUnfinished = 4;
// Split here even where no key frame comes or the next event has no id.
constexpr std::int64_t kMaxEventUs = (base::kMaxRecordingSeconds - 60) * 1'000'000;

bool IsFull(const std::exception& failure) {
    const auto* error = dynamic_cast<const std::system_error*>(&failure);
    return error != nullptr && (error->code().value() == ENOSPC || error->code().value() == EDQUOT);
}

}  // namespace

EventSegmenter::EventSegmenter(int camera, RecorderContext context) : camera_(camera), context_(std::move(context)) {}

EventSegmenter::~EventSegmenter() {
    Close();
    finish_again_us_ = 0;
    FinishPending();
    while (!unfinished_.empty()) {
        GiveUp(unfinished_.begin());
    }
}

void EventSegmenter::Take(Frame frame) {
    const std::int64_t interval_us = IntervalAfter(frame);
    if (frame.medium == base::Medium::kVideo) {
        last_picture_us_ = context_.monotonic_us();
    }
    if (event_ && (!IsWanted() || MustEndBefore(frame))) {
        Close();
    }
    if (event_) {
        Guard([&] { Write(frame); });
        last_flush_us_ = context_.monotonic_us();
    } else {
        const bool is_needed = request_.plan.pre_s > 0 || IsWanted();
        pre_record_.Add(std::move(frame), is_needed ? request_.plan.pre_s + kMaxWaitSeconds : 0);
        Begin();
    }
    interval_us_ = interval_us;
}

std::int64_t EventSegmenter::IntervalAfter(const Frame& frame) {
    if (frame.medium != base::Medium::kVideo) {
        return interval_us_;
    }
    const std::int64_t before_us = std::exchange(previous_us_, frame.timestamp_us);
    const std::int64_t interval_us =
        before_us == 0 ? 0 : std::clamp<std::int64_t>(frame.timestamp_us - before_us, 0, kMaxIntervalUs);
    return interval_us_ + (interval_us - interval_us_) / 4;
}

void EventSegmenter::Tick() {
    const std::int64_t now_us = context_.monotonic_us();
    if (event_ && (!IsWanted() || now_us - last_picture_us_ > context_.no_data_limit_us)) {
        Close();
    }
    // Write flushes by itself while frames come.
    if (event_ && now_us - last_flush_us_ > kFlushUs) {
        last_flush_us_ = now_us;
        Guard([&] { event_->Flush(); });
    }
    if (event_ && now_us >= next_mount_check_us_) {
        next_mount_check_us_ = now_us + kMountCheckUs;
        CheckMount();
    }
    FinishPending();
    if (!event_) {
        Begin();
    }
}

// A disk that was full, unmounted or read-only for a moment must not leave files that look as if a crash had.
void EventSegmenter::FinishPending() {
    const std::int64_t now_us = context_.monotonic_us();
    if (unfinished_.empty() || now_us < finish_again_us_) {
        return;
    }
    finish_again_us_ = now_us + kRetryUs;
    std::erase_if(unfinished_, [&](const Unfinished& left) {
        try {
            left.event->Close();
            return true;
        } catch (const std::exception&) {
            return false;
        }
    });
    while (!unfinished_.empty() && now_us >= unfinished_.front().give_up_us) {
        GiveUp(unfinished_.begin());
    }
}

void EventSegmenter::GiveUp(std::vector<Unfinished>::iterator left) {
    base::LogWarning("event " + std::to_string(left->event->Start().id) + " of camera " + std::to_string(camera_) +
                     " could not be finished: lookhaven verify --repair does it when the disk is well again");
    left->event->FinishRow();
    unfinished_.erase(left);
}

bool EventSegmenter::Flush(int event) {
    return event_ && OpenEvent() == event && Guard([&] { event_->Flush(); });
}

void EventSegmenter::Close() {
    if (event_ && Guard([&] { event_->Close(); })) {
        event_.reset();
        state_ = RecordingState::kReady;
    }
}

std::int64_t EventSegmenter::WallOf(std::int64_t timestamp_us) const {
    return context_.wall_ms() - (context_.monotonic_us() - timestamp_us) / 1000;
}

bool EventSegmenter::IsWanted() const {
    return request_.plan.mode == store::RecordMode::kAlways || WallS() < request_.marks_until_s;
}

int EventSegmenter::Reason() const {
    return request_.plan.mode == store::RecordMode::kAlways ? base::kReasonContinuous : base::kReasonAlarm;
}

// A gap of more than a few seconds, unless the camera always sends so few pictures.
bool EventSegmenter::IsAfterGap(const Frame& frame) const {
    return frame.medium == base::Medium::kVideo &&
           frame.timestamp_us - newest_us_ > std::max(kMaxGapUs, 3 * interval_us_);
}

void EventSegmenter::Write(const Frame& frame) {
    if (frame.medium == base::Medium::kVideo) {
        event_->Write(frame, IsAfterGap(frame));
        newest_us_ = std::max(newest_us_, frame.timestamp_us);
    } else {
        event_->Write(frame, false);
    }
}

bool EventSegmenter::MustEndBefore(const Frame& frame) {
    const EventStart& start = event_->Start();
    const std::int64_t length_us = frame.timestamp_us - start.timestamp_us;
    if (!event_->Takes(frame) || length_us >= kMaxEventUs) {
        return true;
    }
    has_gap_ |= IsAfterGap(frame);
    if (frame.medium != base::Medium::kVideo || !frame.key_frame) {
        return false;
    }
    if ((has_gap_ || frame.timestamp_us < newest_us_) && context_.rows.HasId() && MayCutByTimes()) {
        return true;
    }
    const std::int64_t drift_ms = WallOf(frame.timestamp_us) - (start.wall_ms + length_us / 1000);
    return IsOverdue(length_us) || std::abs(drift_ms) > kClockStepMs || start.mount_id != request_.plan.mount_id ||
           start.reason != Reason();
}

// A camera decides its own times, and each event costs what cameras share: a file, a row, an id.
bool EventSegmenter::MayCutByTimes() {
    const std::int64_t now_us = context_.monotonic_us();
    cuts_accounted_until_us_ = std::max(cuts_accounted_until_us_, now_us - kMaxCutBurst * kCutIntervalUs);
    if (cuts_accounted_until_us_ + kCutIntervalUs > now_us) {
        return false;
    }
    cuts_accounted_until_us_ += kCutIntervalUs;
    return true;
}

// As long as the store has assigned no id for the next event, this one continues.
bool EventSegmenter::IsOverdue(std::int64_t length_us) const {
    return length_us >= std::int64_t{request_.plan.segment_s} * 1'000'000 && context_.rows.HasId();
}

void EventSegmenter::Begin() {
    if (!IsWanted()) {
        state_ = RecordingState::kReady;
        return;
    }
    if (pre_record_.IsEmpty() || context_.monotonic_us() < try_again_us_) {
        return;
    }
    Guard([&] {
        const std::optional<EventStart> start = Prepare(pre_record_.First().timestamp_us);
        if (!start) {
            return;
        }
        event_ = std::make_unique<EventWriter>(*start, *pre_record_.First().format, context_.rows);
        newest_us_ = start->timestamp_us;
        has_gap_ = false;
        if (state_ != RecordingState::kReady) {
            base::LogInfo("camera " + std::to_string(camera_) + " is recorded again");
        }
        state_ = RecordingState::kRecording;
        last_flush_us_ = context_.monotonic_us();
        for (const Frame& frame : pre_record_.TakeAll()) {
            Write(frame);
        }
    });
}

// Nothing, and a state that says why, when no event can begin now.
std::optional<EventStart> EventSegmenter::Prepare(std::int64_t first_us) {
    if (request_.plan.mount_id == 0) {
        Pause(RecordingState::kNoMount, "there is no storage mount");
        return std::nullopt;
    }
    CheckMount();
    if (context_.monotonic_us() < try_again_us_) {
        return std::nullopt;
    }
    const std::optional<int> id = context_.rows.TakeId();
    if (!id) {
        Pause(RecordingState::kNoEventId, "the store has not assigned an id for an event yet");
        return std::nullopt;
    }
    return EventStart{*id, camera_, request_.plan.mount_id, request_.plan.mount, WallOf(first_us), first_us, Reason()};
}

// An event may use half of the reserve before it ends, so that a full disk does not make many short ones.
void EventSegmenter::CheckMount() {
    const std::filesystem::path path = event_ ? event_->Start().mount : request_.plan.mount;
    const int id = event_ ? event_->Start().mount_id : request_.plan.mount_id;
    Guard([&] {
        const std::optional<maintenance::MountFolder> mount =
            maintenance::MountFolder::Open(path, {id, request_.plan.installation});
        if (!mount) {
            Pause(RecordingState::kMountGone, "mount " + std::to_string(id) + " at " + path.string() + " is not there");
            return;
        }
        const maintenance::MountSpace space = mount->Space();
        if (space.free_bytes < space.ReserveBytes() / (event_ ? 2 : 1)) {
            Pause(RecordingState::kDiskFull, "mount " + std::to_string(id) + " at " + path.string() + " is full");
        }
    });
}

// False when the work threw; recording is paused then.
template <class Work>
bool EventSegmenter::Guard(Work&& work) {
    try {
        work();
        return true;
    } catch (const std::exception& failure) {
        Pause(IsFull(failure) ? RecordingState::kDiskFull : RecordingState::kDiskFails, failure.what());
        return false;
    }
}

void EventSegmenter::Pause(RecordingState state, const std::string& reason) {
    if (event_) {
        try {
            event_->Close();
        } catch (const std::exception& failure) {
            base::LogWarning(std::string("an event could not be finished yet: ") + failure.what());
            if (unfinished_.size() == kMaxUnfinished) {
                const auto without_frames =
                    std::ranges::find_if(unfinished_, [](const Unfinished& left) { return !left.event->HasFrames(); });
                GiveUp(without_frames != unfinished_.end() ? without_frames : unfinished_.begin());
            }
            unfinished_.push_back({std::move(event_), context_.monotonic_us() + kFinishTimeoutUs});
        }
        event_.reset();
    }
    if (std::exchange(state_, state) != state) {
        base::LogWarning("recording of camera " + std::to_string(camera_) + " pauses: " + reason);
    }
    try_again_us_ = context_.monotonic_us() + kRetryUs;
    if (state == RecordingState::kDiskFull) {
        context_.need_space();
    }
}

}  // namespace lookhaven::recorder
