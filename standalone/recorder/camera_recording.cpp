// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/camera_recording.h"

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
constexpr std::int64_t kTryAgainUs = 1'000'000;
// Whatever else stands against a cut.
constexpr std::int64_t kLongestUs = (store::kMaxEventSeconds - 60) * 1'000'000;

bool IsFull(const std::exception& failure) {
    const auto* error = dynamic_cast<const std::system_error*>(&failure);
    return error != nullptr && (error->code().value() == ENOSPC || error->code().value() == EDQUOT);
}

}  // namespace

CameraRecording::CameraRecording(int camera, RecordingSurroundings surroundings)
    : camera_(camera),
      surroundings_(std::move(surroundings)) {}

CameraRecording::~CameraRecording() {
    Close();
}

void CameraRecording::Take(Frame frame) {
    if (frame.medium == media::Medium::kVideo) {
        last_picture_us_ = surroundings_.monotonic_us();
    }
    if (event_ && (!IsWanted() || MustEndBefore(frame))) {
        Close();
    }
    if (event_) {
        Guard([&] { event_->Write(frame); });
        last_flush_us_ = surroundings_.monotonic_us();
        return;
    }
    before_.Add(std::move(frame), order_.plan.pre_s);
    Begin();
}

void CameraRecording::Tick() {
    const std::int64_t now_us = surroundings_.monotonic_us();
    if (event_ && (!IsWanted() || now_us - last_picture_us_ > surroundings_.no_data_limit_us)) {
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
    if (!event_) {
        Begin();
    }
}

bool CameraRecording::Flush(int event) {
    return event_ && OpenEvent() == event && Guard([&] { event_->Flush(); });
}

void CameraRecording::Close() {
    if (event_ && Guard([&] { event_->Close(); })) {
        event_.reset();
        state_ = RecordingState::kReady;
    }
}

std::int64_t CameraRecording::WallOf(std::int64_t timestamp_us) const {
    return surroundings_.wall_ms() - (surroundings_.monotonic_us() - timestamp_us) / 1000;
}

bool CameraRecording::IsWanted() const {
    return order_.plan.mode == store::RecordMode::kAlways || WallS() < order_.marks_until_s;
}

int CameraRecording::Reason() const {
    return order_.plan.mode == store::RecordMode::kAlways ? store::kReasonContinuous : store::kReasonAlarm;
}

bool CameraRecording::MustEndBefore(const Frame& frame) const {
    const EventStart& start = event_->Start();
    const std::int64_t length_us = frame.timestamp_us - start.timestamp_us;
    if (!event_->Takes(frame) || length_us >= kLongestUs) {
        return true;
    }
    if (frame.medium != media::Medium::kVideo || !frame.key_frame) {
        return false;
    }
    const std::int64_t drift_ms = WallOf(frame.timestamp_us) - (start.wall_ms + length_us / 1000);
    return IsOverdue(length_us) || std::abs(drift_ms) > kClockStepMs || start.mount_id != order_.plan.mount_id ||
           start.reason != Reason();
}

// Without a number for the next event this one goes on.
bool CameraRecording::IsOverdue(std::int64_t length_us) const {
    return length_us >= std::int64_t{order_.plan.segment_s} * 1'000'000 && surroundings_.ledger.HasId();
}

void CameraRecording::Begin() {
    if (!IsWanted()) {
        state_ = RecordingState::kReady;
        return;
    }
    if (before_.IsEmpty() || surroundings_.monotonic_us() < try_again_us_) {
        return;
    }
    Guard([&] {
        const std::optional<EventStart> start = Prepare(before_.First().timestamp_us);
        if (!start) {
            return;
        }
        event_.emplace(*start, *before_.First().format, surroundings_.ledger);
        if (state_ != RecordingState::kReady) {
            base::LogInfo("camera " + std::to_string(camera_) + " is recorded again");
        }
        state_ = RecordingState::kRecording;
        last_flush_us_ = surroundings_.monotonic_us();
        for (const Frame& frame : before_.TakeAll()) {
            event_->Write(frame);
        }
    });
}

// Nothing, and a state that says why, when no event can begin now.
std::optional<EventStart> CameraRecording::Prepare(std::int64_t first_us) {
    if (order_.plan.mount_id == 0) {
        Pause(RecordingState::kNoMount, "there is no storage mount");
        return std::nullopt;
    }
    CheckMount();
    if (surroundings_.monotonic_us() < try_again_us_) {
        return std::nullopt;
    }
    const std::optional<int> id = surroundings_.ledger.TakeId();
    if (!id) {
        Pause(RecordingState::kNoNumber, "the store has given out no number for an event yet");
        return std::nullopt;
    }
    return EventStart{*id, camera_, order_.plan.mount_id, order_.plan.mount, WallOf(first_us), first_us, Reason()};
}

// An event may use half of the reserve before it ends, so that a full disk does not make many short ones.
void CameraRecording::CheckMount() {
    const std::filesystem::path path = event_ ? event_->Start().mount : order_.plan.mount;
    const int id = event_ ? event_->Start().mount_id : order_.plan.mount_id;
    Guard([&] {
        const std::optional<maintenance::MountFolder> mount = maintenance::MountFolder::Open(path, id);
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
bool CameraRecording::Guard(Work&& work) {
    try {
        work();
        return true;
    } catch (const std::exception& failure) {
        Pause(IsFull(failure) ? RecordingState::kDiskFull : RecordingState::kDiskFails, failure.what());
        return false;
    }
}

void CameraRecording::Pause(RecordingState state, const std::string& reason) {
    if (event_) {
        try {
            event_->Close();
        } catch (const std::exception& failure) {
            base::LogWarning(std::string("an event could not be finished: ") + failure.what());
        }
        event_.reset();
    }
    if (std::exchange(state_, state) != state) {
        base::LogWarning("recording of camera " + std::to_string(camera_) + " pauses: " + reason);
    }
    try_again_us_ = surroundings_.monotonic_us() + kTryAgainUs;
    if (state == RecordingState::kDiskFull) {
        surroundings_.want_room();
    }
}

}  // namespace lookhaven::recorder
