// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/mount_metrics.h"

#include <map>
#include <optional>
#include <string>
#include <system_error>
#include <vector>

#include "standalone/control/common_config.h"
#include "standalone/control/mount_counters.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/maintenance/shared_folder.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"

namespace lookhaven::api {

namespace {

struct MountFigures {
    store::Mount mount;
    bool is_up = false;
    maintenance::MountSpace space;
    std::optional<std::int64_t> oldest_s;
    control::MountCounters counters;  // of a recorder that runs
};

std::vector<MountFigures> LookAtMounts(const base::Installation& installation, store::Store& records) {
    std::map<int, maintenance::MountState> states;
    for (const maintenance::MountStatus& status : maintenance::ReadMountStatus(installation)) {
        states.emplace(status.mount, status.state);
    }
    std::map<int, control::MountCounters> counters;
    if (control::FindRecorder(installation) == control::RecorderState::kAlive) {
        for (const control::MountCounters& each : control::ReadMountCounters(installation)) {
            counters.emplace(each.mount, each);
        }
    }
    std::vector<MountFigures> mounts;
    for (const store::Mount& mount : store::Mounts(records).List()) {
        // A host may do without a shared mount that others have.
        if (!mount.IsOf(installation.HostId()) || maintenance::IsOnlyOnOtherHosts(installation, records, mount)) {
            continue;
        }
        MountFigures& figures = mounts.emplace_back();
        figures.mount = mount;
        figures.counters = counters[mount.id];
        const auto oldest = store::Events(records).InRecordingOrder(mount.id, store::Event(), 1);
        figures.oldest_s = oldest.empty() ? std::nullopt : std::optional(oldest.front().start_s);
        try {
            if (const auto folder = maintenance::OpenMount(records, mount)) {
                figures.space = folder->Space();
                const auto state = states.find(mount.id);
                figures.is_up = state == states.end() || state->second == maintenance::MountState::kReady ||
                                state->second == maintenance::MountState::kKeptFull;
            }
        } catch (const std::system_error&) {
            figures.is_up = false;  // and why, the health says
        }
    }
    return mounts;
}

}  // namespace

void AddMounts(MetricsText& text, const base::Installation& installation, store::Store& records) {
    const std::vector<MountFigures> mounts = LookAtMounts(installation, records);
    const auto add = [&](const char* name, const char* help, const auto& value, const char* type = "gauge") {
        text.Family(name, type, help);
        for (const MountFigures& each : mounts) {
            if (const std::optional<double> number = value(each)) {
                text.Sample(*number, {{"mount", std::to_string(each.mount.id)}, {"name", each.mount.name}});
            }
        }
    };
    const auto space = [](std::int64_t bytes) {
        return [bytes](const MountFigures& each) {
            return each.space.total_bytes > 0 ? std::optional(static_cast<double>(bytes)) : std::nullopt;
        };
    };
    add("lookhaven_mount_up", "Whether the mount is enabled, its disk is there, and its maintenance succeeds.",
        [](const MountFigures& each) { return std::optional(each.mount.enabled && each.is_up ? 1.0 : 0.0); });
    add("lookhaven_mount_size_bytes", "Size of its file system.",
        [&](const MountFigures& each) { return space(each.space.total_bytes)(each); });
    add("lookhaven_mount_free_bytes", "What is free there.",
        [&](const MountFigures& each) { return space(each.space.free_bytes)(each); });
    add("lookhaven_mount_reserve_bytes", "What recording leaves free there.",
        [&](const MountFigures& each) { return space(each.space.ReserveBytes())(each); });
    add("lookhaven_mount_oldest_recording_timestamp_seconds", "When its oldest recording began that may be deleted.",
        [](const MountFigures& each) {
            return each.oldest_s ? std::optional(static_cast<double>(*each.oldest_s)) : std::nullopt;
        });
    const auto counted = [&](const char* name, const char* help, auto field) {
        add(
            name, help,
            [&](const MountFigures& each) {
                return each.counters.mount == 0 ? std::nullopt
                                                : std::optional(static_cast<double>(each.counters.*field));
            },
            "counter");
    };
    using Counters = control::MountCounters;
    counted("lookhaven_mount_retention_runs_total", "Retention runs.", &Counters::retention_runs);
    counted("lookhaven_mount_retention_failures_total", "Retention runs that failed.", &Counters::retention_failures);
    counted("lookhaven_mount_deleted_events_total", "Events deleted by retention runs that did not fail.",
            &Counters::deleted_events);
    counted("lookhaven_mount_deleted_bytes_total", "Bytes of these events on the disk.", &Counters::deleted_bytes);
}

}  // namespace lookhaven::api
