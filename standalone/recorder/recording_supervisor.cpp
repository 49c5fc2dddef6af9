// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/recording_supervisor.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/maintenance/marks.h"
#include "standalone/recorder/host_room.h"
#include "standalone/recorder/schedule.h"
#include "standalone/store/recorder_lease.h"

namespace lookhaven::recorder {

namespace {

// A heartbeat must be missed several times before its host counts as offline.
LeaseTimes TimesFor(std::chrono::microseconds host_offline_limit) {
    return {host_offline_limit.count() / 6, host_offline_limit.count() * 2 / 3};
}

// How long after a mark's end another host may still deliver footage of it.
constexpr std::int64_t kFootageElsewhereS = 900;

}  // namespace

RecordingSupervisor::RecordingSupervisor(const base::Installation& installation,
                                         std::chrono::milliseconds no_data_limit,
                                         std::chrono::milliseconds host_offline_limit)
    : no_data_limit_(no_data_limit),
      flush_requests_(installation),
      camera_status_(installation),
      mount_counters_(installation),
      status_publisher_([&installation](const StatusPublisher::States& states) {
          maintenance::WriteCameraStatus(installation, states.cameras);
          maintenance::WriteMountStatus(installation, states.mounts);
      }),
      rows_(installation.StoreUrl(), store::RecorderName(installation), installation.HostId(),
            TimesFor(host_offline_limit)),
      camera_leases_(installation.HostId() == 0
                         ? nullptr
                         : std::make_unique<CameraLeaseKeeper>(installation, rows_,
                                                               std::chrono::microseconds(host_offline_limit).count())),
      mounts_(
          installation, host_offline_limit, [this] { return rows_.FirstReservedId(); },
          [this](const store::Mark& mark) { return FootageHasEnded(mark); }),
      missed_marks_(installation.StoreUrl(), "look for marks without footage",
                    [this](store::Store& store, const std::stop_token&) {
                        maintenance::CompleteMarks(store, 0, base::WallSeconds(), [this](const store::Mark& mark) {
                            // A host that was cut off stores the rows of its footage when it is back.
                            return (!camera_leases_ || base::WallSeconds() >= mark.end_s + kFootageElsewhereS) &&
                                   !IsHeldElsewhere(mark.camera_id) && FootageHasEnded(mark);
                        });
                    }),
      partitions_(installation.StoreUrl()) {}

// The cameras that a pending mark needs footage of now, and until when.
std::map<int, std::int64_t> RecordingSupervisor::MarkedCameras(const CatalogContents& catalog) const {
    std::map<int, std::int64_t> until_s;
    const std::int64_t now_s = base::WallSeconds();
    for (const auto& [id, pending] : rows_.Pending()) {
        const store::Mark& mark = pending.mark;
        const auto plan = catalog.cameras.find(mark.camera_id);
        // Without a pre-record buffer nothing is left of what is over.
        const bool has_buffer = plan != catalog.cameras.end() && plan->second.pre_s > 0;
        const std::int64_t end_s = has_buffer ? pending.record_until_s : mark.end_s;
        if (plan != catalog.cameras.end() && mark.start_s <= now_s && now_s < end_s &&
            TakesMarkAt(plan->second, mark.moment_s)) {
            until_s[mark.camera_id] = std::max(until_s[mark.camera_id], end_s);
        }
    }
    return until_s;
}

void RecordingSupervisor::Reconcile(const CatalogContents& catalog) {
    const std::size_t cameras = entries_.size();
    const std::map<int, std::int64_t> marked = MarkedCameras(catalog);
    const std::set<int> held = camera_leases_ ? camera_leases_->Held() : std::set<int>();
    std::map<int, CameraPlan> plans;
    for (const auto& [camera, plan] : catalog.cameras) {
        plans.emplace(camera, PlanAt(plan, base::WallSeconds()));
    }
    std::erase_if(entries_,
                  [](const auto& entry) { return entry.second.is_ending && entry.second.worker->HasEnded(); });
    const auto needs = [&](int camera, const CameraPlan& plan) {
        return !rows_.IsRefused() && (camera_leases_ == nullptr || held.contains(camera)) &&
               (plan.mode == store::RecordMode::kAlways || plan.pre_s > 0 || marked.contains(camera));
    };
    for (auto& [camera, entry] : entries_) {
        const auto plan = plans.find(camera);
        if (!entry.is_ending && (plan == plans.end() || !needs(camera, plan->second))) {
            entry.is_ending = true;
            entry.worker->RequestStop();
        }
    }
    for (const auto& [camera, plan] : plans) {
        if (!needs(camera, plan)) {
            continue;
        }
        if (!entries_.contains(camera)) {
            StartRecording({camera, plan.stream});
        }
        const auto entry = entries_.find(camera);
        if (entry == entries_.end() || entry->second.is_ending) {
            continue;  // it is tried again, or started again once it has ended
        }
        entry->second.stream = {camera, plan.stream};
        RecordingRequest request{plan, marked.contains(camera) ? marked.at(camera) : 0};
        mounts_.Redirect(request.plan);
        entry->second.worker->SetRequest(request);
    }
    if (camera_leases_) {
        std::set<int> recorded;
        std::ranges::transform(entries_, std::inserter(recorded, recorded.end()),
                               [](const auto& entry) { return entry.first; });
        camera_leases_->NoteRecorded(std::move(recorded));
    }
    if (entries_.size() > cameras) {
        rows_.Refresh(entries_.size());  // at once, so that a camera's first event need not wait for its id
    }
    mounts_.Reconcile(catalog);
    AnswerFlushes();
}

void RecordingSupervisor::StartRecording(const control::LiveStream& stream) {
    starts_.Try("recording of camera " + std::to_string(stream.camera), [&] {
        const RecorderContext context{rows_, base::MonotonicMicros, base::WallMillis,
                                      [this] { mounts_.RequestSpace(); },
                                      std::chrono::microseconds(no_data_limit_).count()};
        entries_.emplace(stream.camera,
                         Entry{stream, std::make_unique<RecordingWorker>(stream.camera, context, flush_requests_)});
    });
}

void RecordingSupervisor::AnswerFlushes() {
    for (const std::int32_t event : flush_requests_.Pending()) {
        const auto open = std::ranges::find_if(
            entries_, [&](const auto& entry) { return entry.second.worker->OpenEvent() == event; });
        if (open == entries_.end()) {
            flush_requests_.Answer(event, false);
        } else {
            open->second.worker->Flush(event);
        }
    }
}

void RecordingSupervisor::DoEverySecond(const std::map<int, CameraSignal>& signals) {
    rows_.Refresh(entries_.size());
    std::map<int, maintenance::CameraStatus> recorded;
    for (const auto& [camera, entry] : entries_) {
        recorded.emplace(camera, entry.worker->State());
    }
    mounts_.Ask();
    mount_counters_.Write(mounts_.Counters());
    StatusPublisher::States states;
    states.mounts = mounts_.States();
    if (camera_leases_) {
        std::map<int, std::uint64_t> received;
        for (const auto& [camera, signal] : signals) {
            if (signal.is_recorded) {
                received.emplace(camera, signal.bytes);
            }
        }
        camera_leases_->Ask(RoomOf(states.mounts, recorded), received);
    }
    missed_marks_.Ask();
    partitions_.Ask();
    states.cameras = camera_status_.Combine(std::move(recorded), signals);
    status_publisher_.Publish(std::move(states));
}

std::vector<control::LiveStream> RecordingSupervisor::NeededStreams() const {
    std::vector<control::LiveStream> streams;
    for (const auto& [camera, entry] : entries_) {
        if (!entry.is_ending) {
            streams.push_back(entry.stream);
        }
    }
    return streams;
}

std::shared_ptr<FrameQueue> RecordingSupervisor::QueueOf(control::LiveStream stream) const {
    const auto entry = entries_.find(stream.camera);
    return entry != entries_.end() && !entry->second.is_ending && entry->second.stream == stream
               ? entry->second.worker->Queue()
               : nullptr;
}

void RecordingSupervisor::AddCounters(control::StreamCounters& counters) const {
    const std::shared_ptr<FrameQueue> queue = QueueOf(counters.stream);
    if (queue == nullptr) {
        return;
    }
    counters.is_recorded = true;
    counters.dropped_pictures = queue->Dropped().frames;
    counters.queued_bytes = queue->QueuedBytes();
    counters.queue_capacity_bytes = queue->CapacityBytes();
    counters.written_us = entries_.at(counters.stream.camera).worker->WrittenUs();
    counters.stored_us = rows_.StoredUs();
}

void RecordingSupervisor::RequestStop() {
    missed_marks_.RequestStop();
    partitions_.RequestStop();
    if (camera_leases_) {
        camera_leases_->RequestStop();
    }
    status_publisher_.RequestStop();
    mounts_.RequestStop();
    for (auto& [camera, entry] : entries_) {
        entry.is_ending = true;
        entry.worker->RequestStop();
    }
}

bool RecordingSupervisor::HasEnded() {
    if (!std::ranges::all_of(entries_, [](const auto& entry) { return entry.second.worker->HasEnded(); })) {
        return false;
    }
    if (!std::exchange(stores_last_rows_, true)) {
        rows_.RequestStop();
    }
    return rows_.HasEnded() && (!camera_leases_ || camera_leases_->HasEnded()) && missed_marks_.HasEnded() &&
           partitions_.HasEnded() && status_publisher_.HasEnded() && mounts_.HasEnded();
}

// Whether no more rows will come, neither from this recorder nor from files that an earlier one left on a mount.
bool RecordingSupervisor::FootageHasEnded(const store::Mark& mark) const {
    if (rows_.IsRefused() || !rows_.FirstReservedId()) {
        return false;  // another recorder has the footage
    }
    if (IsHeldElsewhere(mark.camera_id) && base::WallSeconds() < mark.end_s + kFootageElsewhereS) {
        return false;  // another host may record more of it
    }
    const std::optional<PendingMark> pending = rows_.FindPendingMark(mark.id);
    return pending && (mounts_.AreRecovered() || mark.start_s > started_s_) &&
           rows_.HasStored(mark.camera_id, pending->record_until_s);
}

bool RecordingSupervisor::IsHeldElsewhere(int camera) const {
    return camera_leases_ && camera_leases_->IsHeldElsewhere(camera);
}

}  // namespace lookhaven::recorder
