// SPDX-License-Identifier: Apache-2.0
//
// Splits the frames of one camera into events: where each begins and ends, and when recording pauses.
//
// Invariants    (1) Every event begins with a key frame and is split before one. Only the end of the request, a lost
//               camera and a failing disk end it elsewhere.
//               (2) Times within an event come from the monotonic clock. A step of the wall clock by more than
//               kClockStepMs ends the event, so that no event's times are wrong by more. So do times that go back and a
//               gap of more than kMaxGapUs that is not the camera's usual distance of pictures.
//               (3) Nothing here throws: trouble with a mount is a state, and recording resumes by itself.
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "standalone/maintenance/camera_status.h"
#include "standalone/recorder/catalog.h"
#include "standalone/recorder/event_writer.h"
#include "standalone/recorder/pre_record_buffer.h"

namespace lookhaven::recorder {

constexpr std::int64_t kClockStepMs = 2'000;
constexpr std::int64_t kMaxGapUs = 3'000'000;

// What the recording of all cameras shares. Borrowed: everything in it outlives them.
struct RecorderContext {
    EventRowQueue& rows;
    std::function<std::int64_t()> monotonic_us;
    std::function<std::int64_t()> wall_ms;
    std::function<void()> need_space;  // called when a disk is full, so that retention runs soon
    std::int64_t no_data_limit_us = 10'000'000;
};

// What is to be recorded of one camera.
struct RecordingRequest {
    CameraPlan plan;
    std::int64_t marks_until_s = 0;  // wall clock; a mark needs footage until then
};

class EventSegmenter {
  public:
    EventSegmenter(int camera, RecorderContext context);
    // Closes the open event.
    ~EventSegmenter();

    void SetRequest(const RecordingRequest& request) { request_ = request; }

    // The camera's next frame, in the order in which the camera sent them. May wait for the disk.
    void Take(Frame frame);
    // Call at least twice a second, whether frames come or not.
    void Tick();
    // Writes everything taken so far to the disk. False when that event is not the open one, or the disk fails.
    bool Flush(int event);
    void Close();

    maintenance::RecordingState State() const { return state_; }
    int OpenEvent() const { return event_ ? event_->Start().id : 0; }

  private:
    // An event that the disk did not let finish.
    struct Unfinished {
        std::unique_ptr<EventWriter> event;
        std::int64_t give_up_us = 0;
    };

    std::int64_t WallS() const { return context_.wall_ms() / 1000; }
    std::int64_t WallOf(std::int64_t timestamp_us) const;
    bool IsWanted() const;
    int Reason() const;
    std::int64_t IntervalAfter(const Frame& frame);
    bool MustEndBefore(const Frame& frame);
    bool IsAfterGap(const Frame& frame) const;
    bool MayCutByTimes();
    void Write(const Frame& frame);
    bool IsOverdue(std::int64_t length_us) const;
    void Begin();
    std::optional<EventStart> Prepare(std::int64_t first_us);
    void CheckMount();
    template <class Work>
    bool Guard(Work&& work);
    void Pause(maintenance::RecordingState state, const std::string& reason);
    void FinishPending();
    void GiveUp(std::vector<Unfinished>::iterator left);

    const int camera_;
    const RecorderContext context_;
    RecordingRequest request_;
    PreRecordBuffer pre_record_;  // used while no event is open
    std::unique_ptr<EventWriter> event_;
    std::vector<Unfinished> unfinished_;  // oldest first
    maintenance::RecordingState state_ = maintenance::RecordingState::kReady;
    std::int64_t last_picture_us_ = 0;
    std::int64_t newest_us_ = 0;    // capture time of the newest picture of the open event
    std::int64_t previous_us_ = 0;  // capture time of the picture before
    std::int64_t interval_us_ = 0;  // of pictures, smoothed
    bool has_gap_ = false;          // in the open event, which ends before the next key frame
    // Each event that begins for the times alone moves it on by its interval.
    std::int64_t cuts_accounted_until_us_ = std::numeric_limits<std::int64_t>::min() / 2;
    std::int64_t last_flush_us_ = 0;
    std::int64_t next_mount_check_us_ = 0;
    std::int64_t try_again_us_ = 0;
    std::int64_t finish_again_us_ = 0;
};

}  // namespace lookhaven::recorder
