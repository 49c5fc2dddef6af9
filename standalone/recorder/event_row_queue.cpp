// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/event_row_queue.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"

namespace lookhaven::recorder {

namespace {

// At least half of them are there. With segments of five minutes, recording continues for two hours and ten to twenty
// minutes without the store, since the last event may last two hours.
constexpr std::size_t kIdsPerCamera = 4;
// From a frame's capture until its row is Put: on its way from the camera a second, in the file's buffers half a
// second.
constexpr std::int64_t kMaxDelayS = 3;

}  // namespace

EventRowQueue::EventRowQueue(const std::string& store_url, const std::string& recorder, int host, LeaseTimes times)
    : stored_us_(base::MonotonicMicros()),
      host_(host),
      lease_(recorder, base::MonotonicMicros, host, times),
      thread_(store_url, "store the events, recording continues",
              [this](store::Store& store, const std::stop_token&) { Work(store); }) {}

std::optional<int> EventRowQueue::TakeId() {
    const std::lock_guard lock(mutex_);
    if (reserve_.empty()) {
        return std::nullopt;
    }
    const int id = reserve_.front();
    reserve_.pop_front();
    return id;
}

bool EventRowQueue::HasId() const {
    const std::lock_guard lock(mutex_);
    return !reserve_.empty();
}

void EventRowQueue::Put(const store::Event& row) {
    bool is_urgent = !row.recording;
    {
        const std::lock_guard lock(mutex_);
        const auto [entry, is_new] = entries_.try_emplace(row.id);
        entry->second.row = row;
        entry->second.row.host_id = host_;
        entry->second.is_dirty = true;
        is_urgent = is_urgent || is_new;
    }
    if (is_urgent) {
        thread_.Ask();
    }
}

void EventRowQueue::Refresh(std::size_t cameras) {
    {
        const std::lock_guard lock(mutex_);
        wanted_reserve_ = cameras * kIdsPerCamera;
    }
    thread_.Ask();
}

void EventRowQueue::NoteWritten(int camera, std::int64_t until_s) {
    const std::lock_guard lock(mutex_);
    written_until_s_[camera] = until_s - kMaxDelayS;
}

void EventRowQueue::NoteEnded(int camera) {
    const std::lock_guard lock(mutex_);
    written_until_s_.erase(camera);
}

bool EventRowQueue::HasUnstored(int camera) const {
    const std::lock_guard lock(mutex_);
    return std::ranges::any_of(entries_, [camera](const auto& entry) { return entry.second.row.camera_id == camera; });
}

bool EventRowQueue::HasStored(int camera, std::int64_t until_s) const {
    const std::lock_guard lock(mutex_);
    if (!written_until_s_.contains(camera) && !stored_until_s_.contains(camera)) {
        return stored_s_ >= until_s;
    }
    const auto stored = stored_until_s_.find(camera);
    return stored != stored_until_s_.end() && stored->second >= until_s;
}

PendingMarks EventRowQueue::Pending() const {
    const std::lock_guard lock(mutex_);
    return pending_marks_;
}

std::optional<PendingMark> EventRowQueue::FindPendingMark(int id) const {
    const std::lock_guard lock(mutex_);
    const auto found = pending_marks_.find(id);
    return found == pending_marks_.end() ? std::nullopt : std::optional(found->second);
}

std::optional<int> EventRowQueue::FirstReservedId() const {
    const std::lock_guard lock(mutex_);
    return first_reserved_id_;
}

void EventRowQueue::RequestStop() {
    is_stopping_ = true;
    thread_.Ask();
    thread_.RequestStop();
}

void EventRowQueue::Work(store::Store& store) {
    // First: rows may fail or wait for a lock, and other hosts take the cameras of one whose heartbeat stops.
    if (RenewLease(store)) {
        FillReserve(store);
    }
    store::Events events(store);
    std::vector<store::Event> grown;
    std::vector<int> dirty;  // the others
    std::map<int, std::int64_t> written_until_s;
    const std::int64_t now_s = base::WallSeconds();
    const std::int64_t now_us = base::MonotonicMicros();
    {
        const std::lock_guard lock(mutex_);
        written_until_s = written_until_s_;
        for (auto& [id, entry] : entries_) {
            if (entry.is_dirty && entry.is_stored && entry.row.recording) {
                entry.is_dirty = false;
                grown.push_back(entry.row);
            } else if (entry.is_dirty) {
                dirty.push_back(id);
            }
        }
    }
    StoreGrowth(events, grown);
    bool is_all_stored = true;
    for (const int id : dirty) {
        RenewLease(store);  // there may be many, on a slow disk
        is_all_stored &= StoreRow(events, id);
    }
    if (is_stopping_ && is_all_stored) {
        ReleaseLease(store);
    }
    // Made and freed without the lock, for which cameras wait.
    PendingMarks pending = UpdatePendingMarks(store::Marks(store).Pending(), pending_marks_, base::WallSeconds());
    const std::lock_guard lock(mutex_);
    pending_marks_.swap(pending);
    if (is_all_stored) {
        stored_until_s_ = std::move(written_until_s);
        stored_s_ = now_s - kMaxDelayS;
        stored_us_ = now_us;
    }
}

bool EventRowQueue::HoldLease(store::Store& store, int first_reserved_id) {
    const bool is_held = lease_.Hold(store, first_reserved_id);
    is_refused_ = !is_held;
    if (!is_held) {
        ForgetReserve();
    }
    return is_held;
}

// Does nothing before it is due, or once a stop is requested. Whether the lease is held and kept.
bool EventRowQueue::RenewLease(store::Store& store) {
    return !is_stopping_ && HoldLease(store, FirstReservedId().value_or(std::numeric_limits<int>::max()));
}

void EventRowQueue::ReleaseLease(store::Store& store) {
    ForgetReserve();
    lease_.Release(store);
}

void EventRowQueue::ForgetReserve() {
    const std::lock_guard lock(mutex_);
    reserve_.clear();
    first_reserved_id_.reset();
}

void EventRowQueue::FillReserve(store::Store& store) {
    std::size_t missing = 0;
    bool is_first = false;
    {
        const std::lock_guard lock(mutex_);
        is_first = !first_reserved_id_;
        if (reserve_.size() * 2 <= wanted_reserve_ || is_first) {
            missing = wanted_reserve_ - reserve_.size();
        }
    }
    if (missing == 0 && !is_first) {
        return;
    }
    const int count = static_cast<int>(std::max<std::size_t>(missing, 1));
    const int first = host_ == 0 ? store::Events(store).NextIds(count) : store::Events(store).ReserveIds(count, host_);
    // Told before the first of them is used: verify leaves files with these ids alone.
    if (is_first && !HoldLease(store, first)) {
        return;
    }
    const std::lock_guard lock(mutex_);
    first_reserved_id_ = first_reserved_id_.value_or(first);
    for (int id = first; id < first + count; ++id) {
        reserve_.push_back(id);
    }
}

void EventRowQueue::StoreGrowth(store::Events& events, const std::vector<store::Event>& grown) {
    try {
        const auto expected = static_cast<int>(grown.size());
        const bool is_refused = expected > 0 && events.Grow(grown) < expected;
        if (is_refused && !is_growth_refused_) {
            base::LogWarning("the store does not take how far some recordings have come; it has their rows, and stores"
                             " their ends when they are finished");
        }
        is_growth_refused_ = is_refused;
    } catch (...) {
        const std::lock_guard lock(mutex_);
        for (const store::Event& row : grown) {
            entries_.at(row.id).is_dirty = true;
        }
        throw;
    }
}

// False when the row must be stored once more.
bool EventRowQueue::StoreRow(store::Events& events, int id) {
    Entry entry;
    {
        const std::lock_guard lock(mutex_);
        entry = entries_.at(id);
        entries_.at(id).is_dirty = false;
    }
    const store::Event& row = entry.row;
    try {
        if (!entry.is_stored) {
            events.Begin(row);
        } else {
            events.Finish(id, row.end_s, row.frame_count, row.size_bytes);
        }
    } catch (const store::AlreadyExists&) {
        // The answer to an earlier insert was lost, or verify has imported the file. The next round updates the row.
        const std::lock_guard lock(mutex_);
        entries_.at(id).is_stored = true;
        entries_.at(id).is_dirty = true;
        thread_.Ask();
        return false;
    } catch (const store::InvalidRecord& failure) {
        base::LogError("event " + std::to_string(id) + " cannot be stored: " + failure.what());
    } catch (...) {
        const std::lock_guard lock(mutex_);
        entries_.at(id).is_dirty = true;
        throw;
    }
    const std::lock_guard lock(mutex_);
    entries_.at(id).is_stored = true;
    if (!row.recording) {
        entries_.erase(id);
    }
    return true;
}

}  // namespace lookhaven::recorder
