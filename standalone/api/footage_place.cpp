// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/footage_place.h"

#include <algorithm>
#include <iterator>
#include <set>
#include <utility>
#include <vector>

#include "standalone/api/export.h"
#include "standalone/binding/rights.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/maintenance/shared_folder.h"
#include "standalone/store/hosts.h"
#include "standalone/store/mounts.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::api {

namespace {

// The hosts that can read the mount; 0 for the only machine.
std::set<int> HostsWith(store::Store& records, const store::Mount& mount, int own_host) {
    if (!mount.IsShared()) {
        return {mount.host_id};
    }
    const std::vector<int> known = store::SharedMounts(records).HostsWith(mount.id);
    std::set<int> hosts(known.begin(), known.end());
    hosts.erase(own_host);
    if (maintenance::IsMountedHere(records, mount)) {
        hosts.insert(own_host);
    }
    return hosts;
}

// Of several hosts this one, else the first that is online, else the first.
int Choose(const Call& call, const std::set<int>& hosts, int own_host) {
    const std::set<int> online = maintenance::OnlineHosts(call.context.Installation());
    const auto first = std::ranges::find_if(hosts, [&](int host) { return online.contains(host); });
    return hosts.contains(own_host) ? own_host : first != hosts.end() ? *first : *hosts.begin();
}

std::string NameOfHost(store::Store& records, int id) {
    const auto host = store::Hosts(records).Find(id);
    return host ? host->name : "a host that was removed";
}

}  // namespace

ForwardTarget TargetOfFootage(const Call& call, const std::optional<Footage>& footage, int own_host) {
    const auto access = call.method == "Download" ? store::CameraAccess::kExport : store::CameraAccess::kPlayback;
    if (!footage || !binding::MayUse(footage->camera_id, access)) {
        return {};
    }
    const std::string what = "this footage of camera " + std::to_string(footage->camera_id);
    const auto mount = store::Mounts(call.Records()).Find(footage->mount_id);
    if (!mount) {
        return {};
    }
    const std::set<int> hosts = HostsWith(call.Records(), *mount, own_host);
    if (hosts.empty()) {
        throw Failure(503, what + " is on the shared mount " + mount->name + ", which is not mounted on any host now");
    }
    // What grows is flushed, and known to grow, by the host that records it.
    const bool is_recorded_elsewhere =
        footage->grows && footage->host_id != own_host && hosts.contains(footage->host_id);
    if (is_recorded_elsewhere && maintenance::OnlineHosts(call.context.Installation()).contains(footage->host_id)) {
        return {footage->host_id, Forwarded::kFootage, what};
    }
    return {Choose(call, hosts, own_host), Forwarded::kFootage, what};
}

ForwardTarget TargetOfExport(const Call& call, int own_host) {
    std::optional<std::set<int>> with_all;
    std::set<int> owners;
    std::string shared;  // names
    for (const int id : MountsOfExport(call)) {
        const auto mount = store::Mounts(call.Records()).Find(id);
        if (!mount) {
            continue;
        }
        const std::set<int> hosts = HostsWith(call.Records(), *mount, own_host);
        std::set<int> common;
        std::ranges::set_intersection(with_all.value_or(hosts), hosts, std::inserter(common, common.end()));
        with_all = std::move(common);
        if (mount->IsShared()) {
            shared += (shared.empty() ? "" : ", ") + mount->name;
        } else {
            owners.insert(mount->host_id);
        }
    }
    if (!with_all) {
        return {};
    }
    if (!with_all->empty()) {
        return {Choose(call, *with_all, own_host), Forwarded::kFootage, "this footage"};
    }
    if (owners.size() < 2) {
        throw Failure(503, owners.empty()
                               ? "no host has all of the shared mounts that have this footage: " + shared
                               : "a part of this footage is on host " + NameOfHost(call.Records(), *owners.begin()) +
                                     ", and another on shared mounts that it does not have now: " + shared);
    }
    std::string names;
    for (const int id : owners) {
        names += (names.empty() ? "" : ", ") + NameOfHost(call.Records(), id);
    }
    throw Failure(409,
                  "this footage lies on several hosts (" + names +
                      "): export each host's cameras, or for a camera that moved each part of the span, by itself");
}

}  // namespace lookhaven::api
