// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/store_metrics.h"

#include <algorithm>
#include <exception>
#include <string>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/store/host_loads.h"
#include "standalone/store/replication.h"
#include "standalone/store/settings.h"

namespace lookhaven::api {

namespace {

void AddStates(MetricsText& text, const base::Installation& installation, store::Store& records) {
    const std::vector<store::Host> hosts = store::Hosts(records).All();
    std::vector<maintenance::HostStatus> states;
    try {
        if (control::FindRecorder(installation) == control::RecorderState::kAlive) {
            states = maintenance::ReadHostStatus(installation);
        }
    } catch (const std::exception& error) {  // the other figures are known all the same
        base::LogWarning(std::string("cannot read which hosts are online: ") + error.what());
    }
    text.Family("lookhaven_host_up", "gauge",
                "Whether the host's recorder runs and reaches the store, as this host's recorder sees it.");
    for (const store::Host& host : hosts) {
        if (const auto state = std::ranges::find(states, host.id, &maintenance::HostStatus::host);
            state != states.end()) {
            text.Sample(state->state == maintenance::HostState::kOffline ? 0 : 1, {{"host", host.name}});
        }
    }
    const std::vector<store::CameraLease> leases = store::CameraLeases(records).List();
    text.Family("lookhaven_host_cameras", "gauge", "Cameras whose lease the host holds.");
    for (const store::Host& host : hosts) {
        text.Sample(static_cast<double>(std::ranges::count(leases, host.id, &store::CameraLease::host_id)),
                    {{"host", host.name}});
    }
    const store::HostLoads loads(hosts, leases);
    text.Family(
        "lookhaven_host_bytes_per_second", "gauge",
        "What the cameras of the host send; of those that were not measured yet, what the others do on average.");
    for (const store::Host& host : hosts) {
        text.Sample(static_cast<double>(loads.Of(host.id).bytes_per_second), {{"host", host.name}});
    }
    text.Family("lookhaven_host_processors", "gauge", "Processors of the host, by which its load is weighed.");
    for (const store::Host& host : hosts) {
        text.Sample(host.processors, {{"host", host.name}});
    }
    text.Family("lookhaven_cameras_without_host", "gauge", "Enabled cameras whose lease no host holds.");
    text.Sample(static_cast<double>(
        std::ranges::count_if(leases, [](const auto& lease) { return lease.enabled && lease.host_id == 0; })));
}

// What PostgreSQL reports of its replication.
void AddReplication(MetricsText& text, store::Store& records) {
    const auto replication = store::ReadReplication(records);
    if (!replication) {
        return;
    }
    text.Family("lookhaven_store_standby", "gauge", "Whether the database server that answers is a standby.");
    text.Sample(replication->is_standby ? 1 : 0);
    text.Family("lookhaven_store_standbys", "gauge", "Standbys that are connected to the database server.");
    text.Sample(replication->standbys);
    if (replication->visible > 0) {  // which takes a right of its own
        text.Family("lookhaven_store_standbys_streaming", "gauge", "Standbys that stream from the database server.");
        text.Sample(replication->streaming);
        text.Family("lookhaven_store_standby_lag_bytes", "gauge", "How far the slowest of these is behind.");
        text.Sample(static_cast<double>(replication->lag_bytes));
    }
}

}  // namespace

void AddStore(MetricsText& text, store::Store* records) {
    const std::int64_t begin_us = base::MonotonicMicros();
    bool is_up = records != nullptr;
    try {
        if (is_up) {
            store::Settings(*records).Revision();
        }
    } catch (const store::StoreError&) {
        is_up = false;
    }
    text.Family("lookhaven_store_up", "gauge", "Whether the record store answers.");
    text.Sample(is_up ? 1 : 0);
    if (is_up) {
        text.Family("lookhaven_store_latency_seconds", "gauge", "How long the record store took for one row.");
        text.Sample(static_cast<double>(base::MonotonicMicros() - begin_us) / 1e6);
    }
}

void AddHosts(MetricsText& text, const base::Installation& installation, store::Store& records) {
    if (installation.HostId() != 0) {
        AddStates(text, installation, records);
    }
    AddReplication(text, records);
}

}  // namespace lookhaven::api
