// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/host_loads.h"

#include <algorithm>
#include <iterator>

namespace lookhaven::store {

namespace {

// 4 Mbit/s.
constexpr std::int64_t kUsualBytesPerSecond = 500'000;

std::int64_t AverageOf(const std::vector<CameraLease>& cameras) {
    std::int64_t sum = 0;
    std::int64_t measured = 0;
    for (const CameraLease& camera : cameras) {
        if (camera.bytes_per_second > 0) {
            sum += camera.bytes_per_second;
            ++measured;
        }
    }
    return measured == 0 ? kUsualBytesPerSecond : sum / measured;
}

}  // namespace

HostLoads::HostLoads(const std::vector<Host>& hosts, const std::vector<CameraLease>& cameras)
    : average_(AverageOf(cameras)) {
    // A host whose recorder never said how many it has is taken for as large as the others, and so are these.
    const bool are_known = std::ranges::all_of(hosts, [](const Host& host) { return host.processors > 0; });
    for (const Host& host : hosts) {
        loads_[host.id].processors = are_known ? host.processors : 1;
    }
    for (const CameraLease& camera : cameras) {
        if (camera.enabled && loads_.contains(camera.host_id)) {
            Add(camera.host_id, BytesPerSecond(camera));
        }
    }
}

std::int64_t HostLoads::BytesPerSecond(const CameraLease& camera) const {
    return camera.bytes_per_second > 0 ? camera.bytes_per_second : average_;
}

HostLoad HostLoads::Of(int host) const {
    const auto load = loads_.find(host);
    return load == loads_.end() ? HostLoad() : load->second;
}

HostLoad HostLoads::With(int host, std::int64_t bytes_per_second) const {
    HostLoad load = Of(host);
    load.bytes_per_second += bytes_per_second;
    return load;
}

std::vector<CameraMove> MovesToBalance(const std::vector<Host>& hosts, const std::vector<CameraLease>& cameras,
                                       const std::set<int>& offline) {
    std::vector<Host> sharing;
    std::ranges::copy_if(hosts, std::back_inserter(sharing), [&offline](const Host& host) {
        return !offline.contains(host.id) && host.room == HostRoom::kFree && !host.draining && !host.recorder.empty();
    });
    HostLoads loads(sharing, cameras);
    std::map<int, std::vector<CameraLease>> floating;  // not moved yet, by host
    for (const CameraLease& camera : cameras) {
        if (camera.enabled && camera.fixed_host_id == 0 &&
            std::ranges::find(sharing, camera.host_id, &Host::id) != sharing.end()) {
            floating[camera.host_id].push_back(camera);
        }
    }
    const auto load_of = [&loads](const auto& entry) { return loads.Of(entry.first); };
    std::vector<CameraMove> moves;
    while (std::erase_if(floating, [](const auto& entry) { return entry.second.empty(); }), !floating.empty()) {
        auto& [most, candidates] = *std::ranges::max_element(floating, {}, load_of);
        const int taker = std::ranges::min_element(sharing, {}, [&](auto& host) { return loads.Of(host.id); })->id;
        // The larger load of both must fall by half of what the camera sends. The newest has the fewest recordings.
        const auto camera = std::find_if(candidates.rbegin(), candidates.rend(), [&, from = most](const auto& each) {
            const std::int64_t bytes = loads.BytesPerSecond(each);
            return loads.With(taker, bytes) <= loads.With(from, -bytes / 2);
        });
        if (camera == candidates.rend()) {
            candidates.clear();
            continue;
        }
        const std::int64_t bytes = loads.BytesPerSecond(*camera);
        loads.Add(most, -bytes);
        loads.Add(taker, bytes);
        moves.push_back({*camera, taker});
        candidates.erase(std::next(camera).base());
    }
    return moves;
}

}  // namespace lookhaven::store
