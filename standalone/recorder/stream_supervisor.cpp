// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/stream_supervisor.h"

#include <algorithm>
#include <exception>
#include <utility>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/media/pace.h"
#include "standalone/ring/inventory.h"

namespace lookhaven::recorder {

namespace {

constexpr std::chrono::milliseconds kPollWhileEnding{20};
constexpr int kOrphanSearchSeconds = 60;
// Of other hosts' cameras, whose rings take memory beside those that this host records. The web API forwards others.
constexpr int kMaxFetchedStreams = 32;
constexpr std::int64_t kStandstillUs = 3'000'000;

}  // namespace

StreamSupervisor::StreamSupervisor(const base::Installation& installation, media::SourceKinds kinds,
                                   std::chrono::milliseconds no_data_limit,
                                   std::chrono::milliseconds host_offline_limit)
    : installation_(installation),
      kinds_(std::move(kinds)),
      no_data_limit_(no_data_limit),
      demand_(installation),
      common_config_(installation),
      counters_(installation),
      catalog_(installation.StoreUrl(), installation.HostId(), [this] { demand_.Wake(); }),
      recordings_(installation, no_data_limit, host_offline_limit) {
    DoEverySecond();
    Reconcile();  // viewers' requests may be older than this recorder
}

void StreamSupervisor::Step() {
    demand_.WaitForDemand(TimeToNextStep());
    if (base::MonotonicMicros() >= next_second_us_) {
        DoEverySecond();
    }
    Reconcile();
}

bool StreamSupervisor::Finish(std::chrono::milliseconds limit) {
    catalog_.RequestStop();
    recordings_.RequestStop();
    for (const auto& [stream, worker] : workers_) {
        worker->RequestStop();
    }
    const std::int64_t end_us = base::MonotonicMicros() + std::chrono::microseconds(limit).count();
    while (DropEndedWorkers(), !workers_.empty() || !catalog_.HasEnded() || !recordings_.HasEnded()) {
        const std::int64_t now_us = base::MonotonicMicros();
        if (now_us >= end_us) {
            return false;
        }
        media::SleepUntil(now_us + 5'000, {});
    }
    return true;
}

std::chrono::milliseconds StreamSupervisor::TimeToNextStep() const {
    const std::chrono::microseconds left(std::max<std::int64_t>(0, next_second_us_ - base::MonotonicMicros()));
    const auto rounded_up = std::chrono::ceil<std::chrono::milliseconds>(left);
    return some_are_ending_ ? std::min(kPollWhileEnding, rounded_up) : rounded_up;
}

void StreamSupervisor::DoEverySecond() {
    const std::int64_t now_us = base::MonotonicMicros();
    if (next_second_us_ != 0 && now_us - next_second_us_ > kStandstillUs) {
        base::LogWarning("the recorder did not run for " + std::to_string((now_us - next_second_us_) / 1'000'000) +
                         " s, of which nothing is recorded: it was stopped, or the machine is overloaded");
    }
    next_second_us_ = now_us + 1'000'000;
    const bool refreshed = common_config_.Refresh(false);
    if (refreshed != std::exchange(common_config_refreshed_, refreshed)) {
        refreshed ? base::LogInfo("the recorder's heartbeat is refreshed again")
                  : base::LogError("another process holds the lock of the recorder's heartbeat");
    }
    catalog_.Refresh();
    recordings_.DoEverySecond(Signals());
    PublishCounters();
    CorrectVideoTypes();
    if (seconds_++ % kOrphanSearchSeconds == 0) {
        if (const std::size_t removed = ring::RemoveOrphans(installation_); removed > 0) {
            base::LogInfo("removed " + std::to_string(removed) + " segments of a dead recorder");
        }
    }
}

void StreamSupervisor::Reconcile() {
    const std::shared_ptr<const CatalogContents> catalog = catalog_.Current();
    recordings_.Reconcile(*catalog);
    std::vector<control::LiveStream> needed = demand_.ActiveStreams(base::MonotonicMicros());
    const std::vector<control::LiveStream> recorded = recordings_.NeededStreams();
    needed.insert(needed.end(), recorded.begin(), recorded.end());
    std::map<control::LiveStream, StreamPlan> plans;
    auto fetched =
        std::ranges::count_if(workers_, [](const auto& each) { return each.second->Plan().other_host.has_value(); });
    for (const control::LiveStream& stream : needed) {
        if (std::optional<StreamPlan> plan = PlanOf(*catalog, stream)) {
            const bool is_new = plan->other_host && !workers_.contains(stream);
            if (!is_new || fetched < kMaxFetchedStreams) {
                plans.emplace(stream, *std::move(plan));
                fetched += is_new ? 1 : 0;
            }
        } else {
            catalog_.Refresh();  // added a moment ago, perhaps
        }
    }
    some_are_ending_ = false;
    for (const auto& [stream, worker] : workers_) {
        const auto plan = plans.find(stream);
        if (plan == plans.end() || !plan->second.HasSourceOf(worker->Plan())) {
            worker->RequestStop();
            some_are_ending_ = true;
        }
    }
    DropEndedWorkers();
    std::erase_if(reported_failures_, [&](const auto& failure) { return !plans.contains(failure.first); });
    for (const auto& [stream, plan] : plans) {
        if (!workers_.contains(stream)) {
            Start(stream, plan);
        }
        if (const auto worker = workers_.find(stream); worker != workers_.end()) {
            worker->second->SetRecording(worker->second->Plan().other_host ? nullptr : recordings_.QueueOf(stream));
        }
    }
}

std::optional<StreamPlan> StreamSupervisor::PlanOf(const CatalogContents& catalog, control::LiveStream stream) const {
    const auto plan = catalog.streams.find(stream);
    const std::optional<int> holder = recordings_.OtherHolder(stream.camera);
    if (plan == catalog.streams.end() || !holder) {
        return std::nullopt;
    }
    StreamPlan result = plan->second;
    // A holder that is not in the catalog was removed, and its lease goes in a moment.
    if (const auto host = catalog.hosts.find(*holder); host != catalog.hosts.end()) {
        result.other_host = host->second;
    }
    return result;
}

std::map<int, CameraSignal> StreamSupervisor::Signals() const {
    std::map<int, CameraSignal> signals;
    for (const auto& [stream, worker] : workers_) {
        if (worker->Plan().other_host) {
            continue;  // that host says how its camera is
        }
        const CameraSignal signal{worker->Plan().camera_name, recordings_.QueueOf(stream) != nullptr, worker->Signal(),
                                  worker->Counts().bytes};
        const auto [known, is_first] = signals.try_emplace(stream.camera, signal);
        if (!is_first && !known->second.is_recorded && (signal.is_recorded || !signal.stream.reason.empty())) {
            known->second = signal;
        }
    }
    return signals;
}

void StreamSupervisor::PublishCounters() {
    const std::int64_t now_us = base::MonotonicMicros();
    std::vector<control::StreamCounters> streams;
    streams.reserve(workers_.size());
    std::erase_if(rates_, [this](const auto& rate) { return !workers_.contains(rate.first); });
    for (const auto& [stream, worker] : workers_) {
        if (worker->Plan().other_host) {
            continue;
        }
        const StreamCounts counts = worker->Counts();
        control::StreamCounters& published = streams.emplace_back();
        published.stream = stream;
        published.pictures = counts.pictures;
        published.bytes = counts.bytes;
        StreamRate& rate = rates_[stream];
        rate.Note(counts, now_us);
        published.pictures_per_second = rate.PicturesPerSecond();
        published.bytes_per_second = rate.BytesPerSecond();
        published.connections = counts.connections;
        published.last_picture_us = counts.last_picture_us;
        recordings_.AddCounters(published);
    }
    counters_.Write(streams);
}

// A camera may be reconfigured or exchanged without anybody changing its record here.
void StreamSupervisor::CorrectVideoTypes() {
    const std::shared_ptr<const CatalogContents> catalog = catalog_.Current();
    for (const auto& [stream, worker] : workers_) {
        const auto plan = catalog->cameras.find(stream.camera);
        const std::optional<base::Codec> codec = worker->Signal().codec;
        if (codec && !worker->Plan().other_host && plan != catalog->cameras.end() &&
            plan->second.live_profile == stream.stream && plan->second.video_type != *codec) {
            catalog_.CorrectVideoType(stream.camera, *codec);
        }
    }
}

void StreamSupervisor::DropEndedWorkers() {
    std::erase_if(workers_, [](const auto& entry) { return entry.second->HasEnded(); });
}

void StreamSupervisor::Start(control::LiveStream stream, const StreamPlan& plan) {
    try {
        workers_.emplace(stream, std::make_unique<StreamWorker>(installation_, kinds_, stream, plan, no_data_limit_));
        reported_failures_.erase(stream);
    } catch (const std::exception& failure) {
        std::string& reported = reported_failures_[stream];
        if (std::exchange(reported, failure.what()) != reported) {
            base::LogError("cannot start camera " + std::to_string(stream.camera) + ": " + reported);
        }
    }
}

}  // namespace lookhaven::recorder
