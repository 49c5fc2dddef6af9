// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/stream_worker.h"

#include <algorithm>
#include <exception>
#include <memory>
#include <utility>

#include "standalone/base/blocked_signals.h"
#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/media/pace.h"

namespace lookhaven::recorder {

namespace {

std::string Title(control::LiveStream stream, const StreamPlan& plan) {
    return "camera " + std::to_string(stream.camera) + " \"" + plan.camera_name + "\" stream " +
           std::to_string(stream.stream) + ": ";
}

}  // namespace

StreamWorker::StreamWorker(const base::Installation& installation, const media::SourceKinds& kinds,
                           control::LiveStream stream, StreamPlan plan, std::chrono::milliseconds no_data_limit)
    : installation_(installation),
      kinds_(kinds),
      stream_(stream),
      plan_(std::move(plan)),
      options_{plan_.credentials, no_data_limit, plan_.insecure},
      backoff_(static_cast<std::uint32_t>(base::MonotonicMicros())) {
    counts_.last_picture_us = base::MonotonicMicros();
    const base::BlockedSignals blocked;
    thread_ = std::jthread([this](const std::stop_token& stop) { Run(stop); });
}

void StreamWorker::SetRecording(std::shared_ptr<FrameQueue> queue) {
    const std::lock_guard lock(mutex_);
    recording_ = std::move(queue);
}

StreamSignal StreamWorker::Signal() const {
    const std::lock_guard lock(mutex_);
    return signal_;
}

void StreamWorker::SetSignal(StreamSignal signal) {
    const std::lock_guard lock(mutex_);
    signal_ = std::move(signal);
}

StreamCounts StreamWorker::Counts() const {
    const std::lock_guard lock(mutex_);
    return counts_;
}

void StreamWorker::Count(const media::Packet& packet) {
    counts_.bytes += packet.data.size();
    if (packet.medium == base::Medium::kVideo) {
        ++counts_.pictures;
        counts_.last_picture_us = base::MonotonicMicros();
    }
}

void StreamWorker::Run(const std::stop_token& stop) {
    base::SetLogCamera(stream_.camera);
    {
        StreamRings rings(installation_, stream_);
        while (!stop.stop_requested()) {
            try {
                Stream(rings, stop);
            } catch (const std::exception& failure) {
                if (!stop.stop_requested()) {
                    ReportFailure(failure);
                    // Viewers of another host's camera connect again, and the web API tells them if that is offline.
                    plan_.other_host ? rings.Close() : rings.EndRun();
                    WaitToTryAgain(rings, stop);
                }
            }
        }
    }
    base::LogInfo(Title(stream_, plan_) + "stopped");
    has_ended_ = true;
}

std::unique_ptr<media::Source> StreamWorker::Open(const std::stop_token& stop) const {
    return plan_.other_host ? OpenHostStream(*plan_.other_host, stream_, options_, stop)
                            : media::OpenSource(kinds_, plan_.url, options_, stop);
}

// Leaves by an exception only.
void StreamWorker::Stream(StreamRings& rings, const std::stop_token& stop) {
    bool live = false;
    std::optional<base::Codec> codec;
    {
        const std::lock_guard lock(mutex_);
        ++counts_.connections;
    }
    const std::unique_ptr<media::Source> source = Open(stop);
    for (;;) {
        const media::Packet packet = source->Next();
        // Recording first: it does not depend on what the live view needs.
        {
            const std::lock_guard lock(mutex_);
            Count(packet);
            if (recording_) {
                recording_->Push(packet, source->Audio());
            }
        }
        WriteRings(rings, packet, source->Audio());
        if (packet.medium == base::Medium::kVideo) {
            backoff_.NotePicture(base::MonotonicMicros());
            if (codec != packet.format->codec) {
                codec = packet.format->codec;
                SetSignal({.codec = codec});
            }
        }
        if (!std::exchange(live, true)) {
            ReportLive(*packet.format, source->Audio());
        }
    }
}

// Rings that cannot be made are tried again at a key frame, after a pause.
void StreamWorker::WriteRings(StreamRings& rings, const media::Packet& packet,
                              const std::optional<media::StreamFormat>& audio) {
    constexpr std::int64_t kPauseUs = 5'000'000;
    const bool can_begin = packet.medium == base::Medium::kVideo && packet.key_frame;
    if (!ring_failure_.empty() && (!can_begin || base::MonotonicMicros() < ring_pause_us_)) {
        return;
    }
    try {
        rings.Write(packet, audio);
        ring_failure_.clear();
    } catch (const std::exception& failure) {
        rings.EndRun();
        ring_pause_us_ = base::MonotonicMicros() + kPauseUs;
        if (std::exchange(ring_failure_, failure.what()) != failure.what()) {
            base::LogError(Title(stream_, plan_) + "no live view: " + failure.what());
        }
    }
}

void StreamWorker::WaitToTryAgain(StreamRings& rings, const std::stop_token& stop) {
    constexpr std::int64_t kHeartbeatUs = 1'000'000;
    const std::int64_t now_us = base::MonotonicMicros();
    // A host that is back is to have the stream before its viewers are forwarded one by one.
    constexpr std::chrono::seconds kMaxDelayOfHost{2};
    const std::chrono::microseconds delay = backoff_.DelayAfterFailure();
    const std::chrono::microseconds wait =
        plan_.other_host ? std::min<std::chrono::microseconds>(delay, kMaxDelayOfHost) : delay;
    const std::int64_t end_us = now_us + wait.count();
    for (std::int64_t step_us = now_us; step_us < end_us;) {
        rings.Beat();
        step_us = std::min(step_us + kHeartbeatUs, end_us);
        if (!media::SleepUntil(step_us, stop)) {
            return;
        }
    }
}

void StreamWorker::ReportLive(const media::StreamFormat& video, const std::optional<media::StreamFormat>& audio) {
    std::string text = Title(stream_, plan_) + "live, " + base::CodecName(video.codec) + ' ' +
                       std::to_string(video.width) + 'x' + std::to_string(video.height);
    if (audio) {
        text += std::string(" with ") + base::CodecName(audio->codec);
    }
    base::LogInfo(text);
    reported_failure_.clear();
}

// Once for each change, not once for each attempt.
void StreamWorker::ReportFailure(const std::exception& failure) {
    const auto* const source_failure = dynamic_cast<const media::SourceError*>(&failure);
    const std::string reason = failure.what();
    SetSignal({{}, source_failure == nullptr ? base::SignalLoss::kOther : source_failure->Cause(), reason});
    if (reason != reported_failure_) {
        base::LogWarning(Title(stream_, plan_) + reason + "; trying again");
        reported_failure_ = reason;
    }
}

}  // namespace lookhaven::recorder
