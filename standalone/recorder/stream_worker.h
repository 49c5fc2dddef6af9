// SPDX-License-Identifier: Apache-2.0
//
// Runs one live stream: reads its source, fills its rings, and reconnects whenever the source fails.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <stop_token>
#include <string>
#include <thread>

#include "standalone/base/installation.h"
#include "standalone/base/signal_loss.h"
#include "standalone/control/demand.h"
#include "standalone/media/source.h"
#include "standalone/recorder/backoff.h"
#include "standalone/recorder/frame_queue.h"
#include "standalone/recorder/host_stream.h"
#include "standalone/recorder/stream_rings.h"

namespace lookhaven::recorder {

// Where a stream comes from.
struct StreamPlan {
    std::string camera_name;
    std::string url;
    media::Credentials credentials;
    bool insecure = false;                     // as in media::SourceOptions
    std::optional<OtherHost> other_host = {};  // to fetch it from in place of the camera

    // Whether a running stream can go on: renaming a camera does not interrupt it.
    bool HasSourceOf(const StreamPlan& other) const {
        return other_host == other.other_host &&
               (other_host || (url == other.url && credentials == other.credentials && insecure == other.insecure));
    }
};

// Whether pictures come. Neither codec nor reason: the first attempt to connect is still under way.
struct StreamSignal {
    std::optional<base::Codec> codec;  // of the pictures; none while they do not come
    base::SignalLoss loss = base::SignalLoss::kOther;
    std::string reason = {};  // why they do not come, in one sentence without credentials; empty while they do
};

// Since the worker was started.
struct StreamCounts {
    std::uint64_t pictures = 0;
    std::uint64_t bytes = 0;
    std::uint64_t connections = 0;
    std::int64_t last_picture_us = 0;  // monotonic; when the worker was started, before there is one
};

class StreamWorker {
  public:
    // Starts the stream's thread, which takes no signals. Installation and kinds must outlive the worker. Throws
    // std::system_error when no thread can be started.
    StreamWorker(const base::Installation& installation, const media::SourceKinds& kinds, control::LiveStream stream,
                 StreamPlan plan, std::chrono::milliseconds no_data_limit);

    const StreamPlan& Plan() const { return plan_; }
    StreamSignal Signal() const;
    StreamCounts Counts() const;

    // Where frames go besides the rings; null when the stream is not recorded.
    void SetRecording(std::shared_ptr<FrameQueue> queue);

    // Asks the thread to end and does not wait for it; the rings are gone when it has.
    void RequestStop() { thread_.request_stop(); }
    // Once true, destruction does not wait.
    bool HasEnded() const { return has_ended_; }

  private:
    void Run(const std::stop_token& stop);
    void Stream(StreamRings& rings, const std::stop_token& stop);
    void WriteRings(StreamRings& rings, const media::Packet& packet, const std::optional<media::StreamFormat>& audio);
    std::unique_ptr<media::Source> Open(const std::stop_token& stop) const;
    void WaitToTryAgain(StreamRings& rings, const std::stop_token& stop);
    void ReportLive(const media::StreamFormat& video, const std::optional<media::StreamFormat>& audio);
    void ReportFailure(const std::exception& failure);
    void SetSignal(StreamSignal signal);
    void Count(const media::Packet& packet);

    const base::Installation& installation_;
    const media::SourceKinds& kinds_;
    const control::LiveStream stream_;
    const StreamPlan plan_;
    const media::SourceOptions options_;
    Backoff backoff_;
    std::string reported_failure_;  // empty when the last report was another
    std::string ring_failure_;      // empty while the rings are written
    std::int64_t ring_pause_us_ = 0;
    mutable std::mutex mutex_;
    StreamCounts counts_;
    StreamSignal signal_;
    std::shared_ptr<FrameQueue> recording_;
    std::atomic<bool> has_ended_ = false;
    std::jthread thread_;  // last: it uses the others
};

}  // namespace lookhaven::recorder
