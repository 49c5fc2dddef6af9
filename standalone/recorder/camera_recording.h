// SPDX-License-Identifier: Apache-2.0
//
// Decides for one camera what is recorded: where an event begins, where it is cut, when recording pauses.
//
// Invariants    (1) Every event begins with a key frame, and is cut before one; only the end of what was asked for, a camera
//               that is lost and a disk that fails end it elsewhere.
//               (2) Times within an event come from the monotonic clock. A step of the wall clock by more than
//               kClockStepMs ends the event, so that no event's times are wrong by more.
//               (3) Nothing here throws: a mount in trouble is a state, out of which recording finds by itself.
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "standalone/maintenance/recording_state.h"
#include "standalone/recorder/catalog.h"
#include "standalone/recorder/event_file.h"
#include "standalone/recorder/pre_record.h"

namespace lookhaven::recorder {

constexpr std::int64_t kClockStepMs = 2'000;

// What the recordings of all cameras share; everything in it outlives them.
struct RecordingSurroundings {
    EventLedger& ledger;
    std::function<std::int64_t()> monotonic_us;
    std::function<std::int64_t()> wall_ms;
    std::function<void()> want_room;  // a disk is full: retention is due
    std::int64_t no_data_limit_us = 10'000'000;
};

// What shall be recorded.
struct RecordingOrder {
    CameraPlan plan;
    std::int64_t marks_until_s = 0;  // wall clock up to which a mark wants footage
};

class CameraRecording {
  public:
    CameraRecording(int camera, RecordingSurroundings surroundings);
    // Closes the event.
    ~CameraRecording();

    void SetOrder(const RecordingOrder& order) { order_ = order; }

    // Takes the camera's next frame.
    void Take(Frame frame);
    // To be called at least twice a second, frames or not.
    void Tick();
    // Everything taken is on the disk, in the event of that id; false when it is not the open one or the disk fails.
    bool Flush(int event);
    void Close();

    maintenance::RecordingState State() const { return state_; }
    int OpenEvent() const { return event_ ? event_->Start().id : 0; }

  private:
    std::int64_t WallS() const { return surroundings_.wall_ms() / 1000; }
    std::int64_t WallOf(std::int64_t timestamp_us) const;
    bool IsWanted() const;
    int Reason() const;
    bool MustEndBefore(const Frame& frame) const;
    bool IsOverdue(std::int64_t length_us) const;
    void Begin();
    std::optional<EventStart> Prepare(std::int64_t first_us);
    void CheckMount();
    template <class Work>
    bool Guard(Work&& work);
    void Pause(maintenance::RecordingState state, const std::string& reason);

    const int camera_;
    const RecordingSurroundings surroundings_;
    RecordingOrder order_;
    PreRecord before_;  // frames while no event is open
    std::optional<EventFile> event_;
    maintenance::RecordingState state_ = maintenance::RecordingState::kReady;
    std::int64_t last_picture_us_ = 0;
    std::int64_t last_flush_us_ = 0;
    std::int64_t next_mount_check_us_ = 0;
    std::int64_t try_again_us_ = 0;
};

}  // namespace lookhaven::recorder
