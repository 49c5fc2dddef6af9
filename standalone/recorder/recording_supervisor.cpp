// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/recording_supervisor.h"

#include <algorithm>
#include <utility>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/maintenance/marks.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/recovery.h"
#include "standalone/maintenance/retention.h"

namespace lookhaven::recorder {

namespace {

constexpr std::int64_t kRetentionUs = 10'000'000;

}  // namespace

RecordingSupervisor::RecordingSupervisor(const base::Installation& installation,
                                         std::chrono::milliseconds no_data_limit)
    : installation_(installation),
      no_data_limit_(no_data_limit),
      flush_requests_(installation),
      rows_(installation.StoreUrl()),
      maintenance_(installation.StoreUrl(), "maintain the recordings",
                   [this](store::Store& store, const std::stop_token&) { Maintain(store); }) {}

// The cameras that a pending mark needs footage of now, and until when.
std::map<int, std::int64_t> RecordingSupervisor::MarkedCameras(const CatalogContents& catalog) const {
    std::map<int, std::int64_t> until_s;
    const std::int64_t now_s = base::WallSeconds();
    for (const store::Mark& mark : rows_.PendingMarks()) {
        if (catalog.cameras.contains(mark.camera_id) && mark.start_s <= now_s && now_s < mark.end_s) {
            until_s[mark.camera_id] = std::max(until_s[mark.camera_id], mark.end_s);
        }
    }
    return until_s;
}

void RecordingSupervisor::Reconcile(const CatalogContents& catalog) {
    const std::map<int, std::int64_t> marked = MarkedCameras(catalog);
    std::erase_if(entries_,
                  [](const auto& entry) { return entry.second.is_ending && entry.second.worker->HasEnded(); });
    const auto needs = [&](int camera, const CameraPlan& plan) {
        return plan.mode == store::RecordMode::kAlways || plan.pre_s > 0 || marked.contains(camera);
    };
    for (auto& [camera, entry] : entries_) {
        const auto plan = catalog.cameras.find(camera);
        if (!entry.is_ending && (plan == catalog.cameras.end() || !needs(camera, plan->second))) {
            entry.is_ending = true;
            entry.worker->RequestStop();
        }
    }
    for (const auto& [camera, plan] : catalog.cameras) {
        if (!needs(camera, plan)) {
            continue;
        }
        Entry& entry = entries_[camera];
        if (entry.is_ending) {
            continue;  // started again once it has ended
        }
        if (!entry.worker) {
            const RecorderContext context{rows_, base::MonotonicMicros, base::WallMillis,
                                          [this] { needs_space_ = true; },
                                          std::chrono::microseconds(no_data_limit_).count()};
            entry.worker = std::make_unique<RecordingWorker>(camera, context, flush_requests_);
        }
        entry.stream = {camera, plan.stream};
        entry.worker->SetRequest({plan, marked.contains(camera) ? marked.at(camera) : 0});
    }
    AnswerFlushes();
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

void RecordingSupervisor::DoEverySecond() {
    rows_.Refresh(entries_.size());
    maintenance_.Ask();
    std::vector<maintenance::RecordingStatus> states;
    for (const auto& [camera, entry] : entries_) {
        states.push_back(entry.worker->State());
    }
    try {
        if (states != published_) {
            maintenance::WriteRecordingStatus(installation_, states);
            published_ = std::move(states);
        }
    } catch (const std::exception& failure) {
        base::LogWarning(failure.what());
    }
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

void RecordingSupervisor::RequestStop() {
    maintenance_.RequestStop();
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
    return rows_.HasEnded() && maintenance_.HasEnded();
}

void RecordingSupervisor::Maintain(store::Store& store) {
    const std::int64_t now_s = base::WallSeconds();
    MarkNewMounts(store);
    RecoverMounts(store, now_s);
    maintenance::CompleteMarks(store, now_s);
    const std::int64_t now_us = base::MonotonicMicros();
    const bool is_clock_trusted = clock_watch_.IsTrusted(now_us, now_s);
    if (!needs_space_.exchange(false) && now_us < next_retention_us_) {
        return;
    }
    next_retention_us_ = now_us + kRetentionUs;
    DeleteOld(store, now_s, is_clock_trusted);
}

// Each mount once, as soon as it is mounted; what failed is tried again.
void RecordingSupervisor::RecoverMounts(store::Store& store, std::int64_t now_s) {
    const std::optional<int> first = rows_.FirstOwnId();
    if (!first) {
        return;
    }
    for (const store::Mount& mount : store::Mounts(store).List()) {
        if (!recovered_mounts_.contains(mount.id)) {
            TryOn(mount, "recover the events of", [&] {
                if (maintenance::Recover(store, mount, *first, now_s)) {
                    recovered_mounts_.insert(mount.id);
                }
            });
        }
    }
}

// A mount without any events gets its marker file; one that has events but no marker is an unplugged disk.
void RecordingSupervisor::MarkNewMounts(store::Store& store) {
    for (const store::Mount& mount : store::Mounts(store).List()) {
        TryOn(mount, "mark", [&] {
            if (mount.enabled && maintenance::MountFolder::HasNoMarker(mount.path) &&
                store::Events(store).Content(mount.id).events == 0) {
                maintenance::MountFolder::WriteMarker(mount.path, mount.id);
            }
        });
    }
}

void RecordingSupervisor::DeleteOld(store::Store& store, std::int64_t now_s, bool is_clock_trusted) {
    for (const store::Mount& mount : store::Mounts(store).List()) {
        TryOn(mount, "delete old events of", [&] {
            const maintenance::RetentionResult deleted = maintenance::EnforceRetention(
                store, mount, now_s,
                is_clock_trusted ? maintenance::AgeLimit::kApplies : maintenance::AgeLimit::kWaits);
            if (deleted.events > 0) {
                base::LogInfo("mount " + std::to_string(mount.id) + ": removed " + std::to_string(deleted.events) +
                              " old events");
            }
        });
    }
}

// Trouble with one mount must not keep the others from being maintained. Logged once for each reason.
template <class Work>
void RecordingSupervisor::TryOn(const store::Mount& mount, const std::string& purpose, Work&& work) {
    const std::string what = purpose + " mount " + std::to_string(mount.id);
    try {
        work();
        reported_failures_.erase(what);
    } catch (const store::StoreError&) {
        throw;
    } catch (const std::exception& failure) {
        if (std::exchange(reported_failures_[what], failure.what()) != failure.what()) {
            base::LogWarning("cannot " + what + ": " + failure.what());
        }
    }
}

}  // namespace lookhaven::recorder
