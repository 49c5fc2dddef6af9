// SPDX-License-Identifier: Apache-2.0
//
// The hosts that share this one's store, as its recorder sees them, and the standbys of that store.
#include <algorithm>
#include <system_error>

#include "standalone/base/amounts.h"
#include "standalone/base/concat.h"
#include "standalone/control/common_config.h"
#include "standalone/doctor/checks.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/store/host_loads.h"
#include "standalone/store/replication.h"

namespace lookhaven::doctor {

namespace {

void AddOffline(const base::Installation& installation, const std::vector<store::Host>& hosts, Findings& findings) {
    for (const int id : maintenance::OfflineHosts(installation)) {
        if (const auto host = std::ranges::find(hosts, id, &store::Host::id); host != hosts.end()) {
            findings.push_back({base::Concat("host ", host->name,
                                             " is offline: ", "its recorder does not run, or does not reach the store"),
                                "start Lookhaven there; where it is gone for good, remove the host"});
        }
    }
}

// As after the return of a host that was offline.
void AddUnequalLoads(const base::Installation& installation, const std::vector<store::Host>& hosts, store::Store& store,
                     Findings& findings) {
    const auto cameras = store::CameraLeases(store).List();
    const auto moves = store::MovesToBalance(hosts, cameras, maintenance::OfflineHosts(installation));
    if (moves.size() < 2) {
        return;
    }
    const auto most = std::ranges::find(hosts, moves.front().camera.host_id, &store::Host::id);
    findings.push_back({base::Concat("host ", most->name, " has more to do than others: ",
                                     base::FormatSize(store::HostLoads(hosts, cameras).Of(most->id).bytes_per_second),
                                     " a second from its cameras"),
                        base::Concat("run lookhaven host balance, which moves ", moves.size(),
                                     " cameras; each is not recorded for some seconds then"),
                        Severity::kNote});
}

void AddVersions(const std::vector<store::Host>& hosts, const store::Host& own, Findings& findings) {
    for (const store::Host& host : hosts) {
        if (!host.version.empty() && !own.version.empty() && host.version != own.version) {
            findings.push_back(
                {base::Concat("host ", host.name, " runs version ", host.version, ", this one ", own.version),
                 "upgrade all hosts to the same version", Severity::kNote});
        }
    }
}

void AddStandbys(const store::Replication& replication, Findings& findings) {
    if (const int lost = replication.visible - replication.streaming; lost > 0) {
        findings.push_back(
            {base::Concat(lost, " of ", replication.standbys, " standbys of the database server do not stream from it"),
             "look at pg_stat_replication, and at the log of the standby", Severity::kNote});
    }
}

}  // namespace

Findings CheckHosts(const base::Installation& installation) {
    Findings findings;
    try {
        store::Store store = store::Store::Open(installation.StoreUrl());
        const std::vector<store::Host> hosts = store::Hosts(store).All();
        const auto own = std::ranges::find(hosts, installation.HostId(), &store::Host::id);
        if (own != hosts.end()) {
            AddVersions(hosts, *own, findings);
            // Otherwise its report is old; CheckRecorder tells that.
            if (control::FindRecorder(installation) == control::RecorderState::kAlive) {
                AddOffline(installation, hosts, findings);
                AddUnequalLoads(installation, hosts, store, findings);
            }
        } else if (!hosts.empty()) {
            findings.push_back({"this machine is not one of the hosts that share its store, so it records nothing",
                                "stop the server, run lookhaven host add, and start the server"});
        }
        if (const auto replication = store::ReadReplication(store)) {
            AddStandbys(*replication, findings);
        }
    } catch (const store::StoreError&) {
        return {};  // CheckStore reports it
    } catch (const std::system_error&) {
        if (IsStateWritable(installation)) {
            throw;
        }
        return {};  // CheckFolder reports it
    }
    return findings;
}

}  // namespace lookhaven::doctor
