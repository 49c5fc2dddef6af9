// SPDX-License-Identifier: Apache-2.0
//
// Keeps exactly those live streams running that a viewer or a recording needs.
//
// Why so        Connecting to a camera, or leaving one, may take long. So this thread only compares what runs with what
//               is needed, every second and at each new request, and never waits for a worker.
// Thread safety One thread.
#pragma once

#include <chrono>
#include <map>
#include <memory>
#include <optional>
#include <string>

#include "standalone/base/installation.h"
#include "standalone/control/common_config.h"
#include "standalone/control/demand.h"
#include "standalone/control/stream_counters.h"
#include "standalone/recorder/catalog.h"
#include "standalone/recorder/recording_supervisor.h"
#include "standalone/recorder/stream_rate.h"
#include "standalone/recorder/stream_worker.h"

namespace lookhaven::recorder {

class StreamSupervisor {
  public:
    // Removes the shared memory that a dead recorder of this installation left. The installation must outlive the
    // supervisor. host_offline_limit: how long a host's heartbeat stands still until others take its cameras over. Throws
    // std::system_error when the shared tables cannot be made.
    StreamSupervisor(const base::Installation& installation, media::SourceKinds kinds,
                     std::chrono::milliseconds no_data_limit,
                     std::chrono::milliseconds host_offline_limit = kHostOfflineLimit);

    // One pass: waits up to a second for something to do and does it. A signal ends the wait early.
    void Step();

    // Stops all threads. False when one of them did not end within the limit; the process must then leave without
    // destroying the supervisor, which would wait for it.
    bool Finish(std::chrono::milliseconds limit);

  private:
    void DoEverySecond();
    void Reconcile();
    void DropEndedWorkers();
    // The stream's plan, with the host to fetch it from where another host has the camera. Nothing where there is no
    // such stream, and while it is not known who has which camera.
    std::optional<StreamPlan> PlanOf(const CatalogContents& catalog, control::LiveStream stream) const;
    std::map<int, CameraSignal> Signals() const;
    void PublishCounters();
    void CorrectVideoTypes();
    void Start(control::LiveStream stream, const StreamPlan& plan);
    std::chrono::milliseconds TimeToNextStep() const;

    const base::Installation& installation_;
    const media::SourceKinds kinds_;
    std::chrono::milliseconds no_data_limit_;
    control::Demand demand_;
    control::CommonConfigKeeper common_config_;
    control::StreamCountersWriter counters_;
    Catalog catalog_;
    RecordingSupervisor recordings_;
    std::map<control::LiveStream, std::unique_ptr<StreamWorker>> workers_;
    std::map<control::LiveStream, StreamRate> rates_;
    std::int64_t next_second_us_ = 0;
    std::int64_t seconds_ = 0;
    bool common_config_refreshed_ = true;
    bool some_are_ending_ = false;
    std::map<control::LiveStream, std::string> reported_failures_;  // of streams that could not be started
};

}  // namespace lookhaven::recorder
