// SPDX-License-Identifier: Apache-2.0
//
// How much hosts that share the store have to do: what their cameras send, by their processors.
//
// Why so        Every host decides by itself which cameras it takes, so all must come to the same numbers: they are
//               made of what the store has alone, and are whole.
#pragma once

#include <compare>
#include <cstdint>
#include <map>
#include <set>
#include <vector>

#include "standalone/store/camera_leases.h"
#include "standalone/store/hosts.h"

namespace lookhaven::store {

struct HostLoad {
    std::int64_t bytes_per_second = 0;
    int processors = 1;

    // By the bytes for each processor.
    std::weak_ordering operator<=>(const HostLoad& other) const {
        return bytes_per_second * other.processors <=> other.bytes_per_second * processors;
    }
    bool operator==(const HostLoad& other) const { return std::is_eq(*this <=> other); }
};

class HostLoads {
  public:
    // A camera counts for the host that has its lease, unless it is disabled.
    HostLoads(const std::vector<Host>& hosts, const std::vector<CameraLease>& cameras);

    // What a camera sends; where that was not measured yet, what the others send on average.
    std::int64_t BytesPerSecond(const CameraLease& camera) const;
    // Nothing to do, for an unknown host.
    HostLoad Of(int host) const;
    // With that much more, or less.
    HostLoad With(int host, std::int64_t bytes_per_second) const;
    void Add(int host, std::int64_t bytes_per_second) { loads_[host] = With(host, bytes_per_second); }

  private:
    std::int64_t average_;
    std::map<int, HostLoad> loads_;
};

struct CameraMove {
    CameraLease camera;
    int host = 0;  // to which
};

// The moves of floating cameras after which the hosts have equally much to do, as far as that is worth a gap in a
// recording. Hosts that drain, are full, are offline or have no recorder or mount take no part.
std::vector<CameraMove> MovesToBalance(const std::vector<Host>& hosts, const std::vector<CameraLease>& cameras,
                                       const std::set<int>& offline);

}  // namespace lookhaven::store
