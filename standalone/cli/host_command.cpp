// SPDX-License-Identifier: Apache-2.0
//
// lookhaven host: the machines that share one store in PostgreSQL, and with it cameras, recordings and accounts.
#include <algorithm>
#include <optional>
#include <set>
#include <string>

#include "standalone/admin/change.h"
#include "standalone/admin/hosts.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/running.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/control/common_config.h"
#include "standalone/maintenance/host_status.h"
#include "standalone/remote/certificate.h"
#include "standalone/store/host_loads.h"

namespace lookhaven::cli {

namespace {

constexpr int kDefaultPort = 8443;
constexpr const char* kUnknown = "unknown";

struct Request {
    std::string name;
    std::string address;
    int port = kDefaultPort;
    bool yes = false;
};

std::string StateText(const Json::Value& host) {
    const std::string room = host["state"] == kUnknown ? "" : host["room"].asString();
    return host["state"].asString() + (host["draining"].asBool() ? ", drains" : "") +
           (room == "full"   ? ", full"
            : room == "none" ? ", no mount"
                             : "");
}

const char* NameOf(store::HostRoom room) {
    return room == store::HostRoom::kFull ? "full" : room == store::HostRoom::kFree ? "free" : "none";
}

std::string LoadText(const Json::Value& host) {
    return FormatSize(host["bytes_per_second"].asInt64()) + "/s";
}

constexpr Column kColumns[] = {{"id", "id"},           {"name", "name"},        {"address", "address"},
                               {"port", "port"},       {"version", "version"},  {"cameras", "cameras"},
                               {"load", "", LoadText}, {"state", "", StateText}};

void Add(const Console& console, const Request& request) try {
    const base::Installation installation = console.Installation();
    store::Store store = console.OpenStore();
    RequireStopped(installation);
    RequireNoOtherRecorder(installation, store);
    const bool is_known = store::Hosts(store).Find(installation.HostId()).has_value();
    const store::Host host = admin::AddHost(store, {}, installation, {request.name, request.address, request.port});
    console.Answer(admin::HostRecord(host), is_known ? "Changed" : "Added", " this machine as host ", host.name,
                   " with id ", host.id, ". Start Lookhaven again.");
} catch (const remote::InvalidCertificate& error) {
    throw Failure(kDataError, "this machine's web server has no certificate yet: ", error.what());
}

// The recorder of this machine runs, which watches the heartbeats of the others.
bool IsWatching(const base::Installation& installation) {
    return control::FindRecorder(installation) == control::RecorderState::kAlive;
}

// As the recorder of this machine sees them.
void List(const Console& console) {
    const base::Installation installation = console.Installation();
    store::Store store = console.OpenStore();
    const auto states =
        IsWatching(installation) ? maintenance::ReadHostStatus(installation) : std::vector<maintenance::HostStatus>();
    const auto leases = store::CameraLeases(store).List();
    const auto hosts = store::Hosts(store).All();
    const store::HostLoads loads(hosts, leases);
    Json::Value data = Json::arrayValue;
    for (const store::Host& host : hosts) {
        const auto state = std::ranges::find(states, host.id, &maintenance::HostStatus::host);
        Json::Value& entry = data.append(admin::HostRecord(host));
        entry["cameras"] = static_cast<int>(std::ranges::count(leases, host.id, &store::CameraLease::host_id));
        entry["bytes_per_second"] = Json::Int64(loads.Of(host.id).bytes_per_second);
        entry["processors"] = host.processors;
        entry["room"] = NameOf(host.room);
        entry["state"] = state == states.end() ? kUnknown : maintenance::NameOf(state->state);
    }
    console.Answer(data, Table(kColumns, data));
}

template <bool kDraining>
void Drain(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const store::Host host = admin::DrainHost(store, {}, request.name, kDraining);
    console.Answer(admin::HostRecord(host), "The host ", host.name,
                   kDraining ? " gives its cameras to others, all but those that are fixed to it, and takes none."
                             : " takes cameras again.");
}

void Balance(const Console& console) {
    const base::Installation installation = console.Installation();
    store::Store store = console.OpenStore();
    const auto offline = IsWatching(installation) ? maintenance::OfflineHosts(installation) : std::set<int>();
    const int cameras = admin::BalanceHosts(store, {}, offline);
    console.Answer(Object("cameras", cameras),
                   cameras == 0 ? "No camera has to move." : Concat(cameras, " cameras move."));
}

void Remove(const Console& console, const Request& request) {
    const base::Installation installation = console.Installation();
    store::Store store = console.OpenStore();
    try {
        const store::Host host = admin::RemoveHost(store, {}, request.name, request.yes);
        if (host.id == installation.HostId()) {
            installation.SetHostId(0);
        }
        console.Answer(admin::HostRecord(host), "Removed the host ", host.name,
                       "; what lies on its mounts is left as it is.");
    } catch (const admin::StillNeeded& refusal) {
        throw Failure(kDataError, refusal.what(), request.yes ? "" : "; see lookhaven host remove --help");
    }
}

}  // namespace

void AddHosts(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "host", "Machines that share one store, and with it everything");
    Request& request = group.request();
    const std::string name = "The host's name";
    group.Add("add", "Makes this machine a host of its store, or changes how it is reached, while it is stopped", Add)
        .Option("--name", request.name, name, Required)
        .Option("--address", request.address, "Its address for the other hosts", Required)
        .Option("--port", request.port, "Its HTTPS port (default: 8443)", Satisfies(CLI::Range(1, 65535)));
    group.Add("list", "Lists the hosts, as this one sees them", List);
    group.Add("drain", "Has a host give its cameras to others, and take none", Drain<true>)
        .Option("name", request.name, name, Required);
    group.Add("undrain", "Lets a host take cameras again", Drain<false>).Option("name", request.name, name, Required);
    group.Add("balance", "Distributes the cameras evenly among the hosts", Balance);
    group.Add("remove", "Removes a host that is stopped; the recordings on its mounts are left as they are", Remove)
        .Option("name", request.name, name, Required)
        .Flag("--yes", request.yes, "Also where its own mounts hold recordings, which only that host can still play");
}

}  // namespace lookhaven::cli
