// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/hosts.h"

#include <algorithm>
#include <vector>

#include "standalone/admin/change.h"
#include "standalone/store/camera_leases.h"
#include "standalone/store/events.h"
#include "standalone/store/host_loads.h"
#include "standalone/store/mounts.h"

namespace lookhaven::admin {

namespace {

store::Host RequireHost(store::Store& store, const std::string& name) {
    std::optional<store::Host> host = store::Hosts(store).FindByName(name);
    if (!host) {
        throw store::NotFound("there is no host \"" + name + "\": see lookhaven host list");
    }
    return *std::move(host);
}

}  // namespace

Json::Value HostRecord(const store::Host& host) {
    Json::Value json;
    json["id"] = host.id;
    json["name"] = host.name;
    json["address"] = host.address;
    json["port"] = host.port;
    json["version"] = host.version;
    json["draining"] = host.draining;
    return json;
}

store::Host DrainHost(store::Store& store, const Actor& actor, const std::string& name, bool draining) {
    store::Host host;
    Apply(store, actor, [&] {
        const store::Host before = RequireHost(store, name);
        host = before;
        host.draining = draining;
        store::Hosts(store).Update(host);
        return Change{"host.set", Named(name, host.id), HostRecord(before), HostRecord(host)};
    });
    return host;
}

std::int64_t FootageOf(store::Store& store, int host) {
    std::int64_t events = 0;
    for (const store::Mount& mount : store::Mounts(store).List()) {
        events += mount.host_id == host ? store::Events(store).Content(mount.id).events : 0;
    }
    return events;
}

store::Host RemoveHost(store::Store& store, const Actor& actor, const std::string& name, bool confirmed) {
    store::Host host;
    try {
        Apply(store, actor, [&] {
            host = RequireHost(store, name);
            const bool is_last = store::Hosts(store).All().size() == 1;
            const std::int64_t events = is_last || confirmed ? 0 : FootageOf(store, host.id);
            if (events > 0) {
                throw StillNeeded("there are " + std::to_string(events) + " recordings on the mounts of " + name +
                                  ", which can be played on that host alone");
            }
            store::Hosts(store).Remove(host.id);
            return Change{"host.remove", Named(name, host.id), HostRecord(host), {}};
        });
    } catch (const store::InvalidRecord& error) {
        throw StillNeeded(error.what());
    }
    return host;
}

int BalanceHosts(store::Store& store, const Actor& actor, const std::set<int>& offline) {
    std::vector<store::CameraMove> moves;
    Apply(store, actor, [&] {
        store::CameraLeases leases(store);
        moves = store::MovesToBalance(store::Hosts(store).All(), leases.List(), offline);
        Json::Value moved;
        for (const auto& [camera, host] : moves) {
            leases.Move(camera.camera_id, host);
            moved[std::to_string(camera.camera_id)] = host;
        }
        return Change{"host.balance", "cameras", {}, moved};
    });
    return static_cast<int>(moves.size());
}

int HostNamed(store::Store& store, const std::string& name) {
    return name == kAnyHost ? 0 : RequireHost(store, name).id;
}

int OwnHost(store::Store& store, const base::Installation& installation) {
    const std::vector<store::Host> hosts = store::Hosts(store).All();
    const int own = installation.HostId();
    if (hosts.empty()) {
        return 0;
    }
    if (std::ranges::find(hosts, own, &store::Host::id) == hosts.end()) {
        throw store::InvalidRecord("hosts share this store, and this machine is not one of them: add it with lookhaven"
                                   " host add");
    }
    return own;
}

}  // namespace lookhaven::admin
