// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/assignment.h"

#include <algorithm>
#include <utility>

#include "standalone/store/host_loads.h"

namespace lookhaven::recorder {

namespace {

// A gap between two looks at the store longer than offline_us / kMaxGapPart restarts every host's timer.
constexpr std::int64_t kMaxGapPart = 3;

// Of those that take cameras: how large another one is does not matter.
store::HostLoads LoadsOf(const std::vector<AssignedHost>& hosts, const std::vector<store::CameraLease>& cameras) {
    std::vector<store::Host> taking;
    for (const AssignedHost& host : hosts) {
        if (host.takes) {
            taking.push_back({.id = host.id, .processors = host.processors});
        }
    }
    return {taking, cameras};
}

class Sharing {
  public:
    Sharing(const std::vector<AssignedHost>& hosts, const std::vector<store::CameraLease>& cameras)
        : loads_(LoadsOf(hosts, cameras)) {
        for (const AssignedHost& host : hosts) {
            hosts_.emplace(host.id, host);
        }
    }

    bool IsOnline(int host) const { return hosts_.contains(host) && hosts_.at(host).is_online; }
    bool Runs(int host) const { return hosts_.contains(host) && hosts_.at(host).runs; }
    bool Takes(int host) const { return hosts_.contains(host) && hosts_.at(host).takes; }
    bool AnotherTakes(int host) const {
        return std::ranges::any_of(hosts_,
                                   [host](const auto& entry) { return entry.first != host && entry.second.takes; });
    }

    // Nobody has it, or its holder is offline.
    bool IsFree(const store::CameraLease& camera) const { return !IsOnline(camera.host_id); }

    bool MustGive(int own, const store::CameraLease& camera) const {
        if (!camera.enabled) {
            return true;
        }
        if (camera.fixed_host_id != 0) {
            return camera.fixed_host_id != own && Runs(camera.fixed_host_id);
        }
        if (camera.next_host_id != 0 && camera.next_host_id != own && Takes(camera.next_host_id)) {
            return true;
        }
        return hosts_.at(own).gives && AnotherTakes(own);
    }

    // Who takes a camera that is free; 0 for nobody. It counts as that host's from then on.
    int Taker(const store::CameraLease& camera) {
        int taker = 0;
        if (camera.fixed_host_id != 0) {
            taker = Runs(camera.fixed_host_id) ? camera.fixed_host_id : 0;
        } else if (Takes(camera.next_host_id)) {
            taker = camera.next_host_id;
        } else {
            for (const auto& [id, host] : hosts_) {
                if (host.takes && (taker == 0 || HasMoreRoom(host, hosts_.at(taker), camera))) {
                    taker = id;
                }
            }
        }
        if (taker != 0) {
            loads_.Add(taker, loads_.BytesPerSecond(camera));
        }
        return taker;
    }

  private:
    bool HasMoreRoom(const AssignedHost& one, const AssignedHost& other, const store::CameraLease& camera) const {
        const std::int64_t more = loads_.BytesPerSecond(camera);
        return one.is_full != other.is_full ? other.is_full : loads_.With(one.id, more) < loads_.With(other.id, more);
    }

    std::map<int, AssignedHost> hosts_;
    store::HostLoads loads_;
};

}  // namespace

void HostWatch::Observe(const std::vector<store::Host>& hosts, std::int64_t now_us) {
    const bool is_gap = now_us - observed_us_ > offline_us_ / kMaxGapPart;
    observed_us_ = now_us;
    std::map<int, Heartbeat> seen;
    for (const store::Host& host : hosts) {
        const auto known = heartbeats_.find(host.id);
        const bool stands_still = known != heartbeats_.end() && known->second.count == host.heartbeat;
        seen[host.id] = {host.heartbeat, stands_still && !is_gap ? known->second.changed_us : now_us};
    }
    heartbeats_ = std::move(seen);
}

bool HostWatch::IsOnline(int host) const {
    const auto known = heartbeats_.find(host);
    return known != heartbeats_.end() && observed_us_ - known->second.changed_us < offline_us_;
}

Assignment Assign(int own, const std::vector<AssignedHost>& hosts, const std::vector<store::CameraLease>& cameras) {
    Sharing sharing(hosts, cameras);
    Assignment assignment;
    for (const store::CameraLease& camera : cameras) {
        if (camera.host_id == own) {
            if (sharing.MustGive(own, camera)) {
                assignment.give.push_back(camera.camera_id);
            }
        } else if (camera.enabled && sharing.IsFree(camera) && sharing.Taker(camera) == own) {
            assignment.take.push_back(camera);
        }
    }
    return assignment;
}

}  // namespace lookhaven::recorder
