// SPDX-License-Identifier: Apache-2.0
//
// Storage mounts: the folders that recordings are written to, and how much of them may be kept.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

// In place of a host's id: a folder that several hosts mount, at the same path each.
constexpr int kAllHosts = -1;

struct Mount {
    int id = 0;                  // from 1, never used twice, since events carry it
    std::string name;            // UTF-8, 1 to 64 bytes, no other mount's
    std::string path;            // absolute; no mount lies inside another of the same host
    std::int64_t max_bytes = 0;  // retention keeps below this; 0: no limit but the disk's
    std::int64_t max_age_s = 0;  // retention removes what is older; 0: no limit
    bool enabled = true;         // recordings are written to it; those on it can be played either way
    bool is_default = false;     // where cameras record that name no mount
    int host_id = 0;             // of store/hosts.h, which has it; kAllHosts; 0: the only machine

    bool IsShared() const { return host_id == kAllHosts; }
    // Whether that host may have it, or the only machine for 0.
    bool IsOf(int host) const { return IsShared() || host_id == host; }
};

// Invariants    (1) Every change raises Settings::Revision() in the same transaction.
//               (2) While a host has mounts, exactly one of them is its default; likewise of the shared ones.
class Mounts {
  public:
    // The store must outlive this object.
    explicit Mounts(Store& store) : connection_(store.connection()) {}

    // Stores the record under a new id, which it returns; the first mount becomes the default. Does not look at the
    // folder. Throws InvalidRecord or AlreadyExists.
    int Add(const Mount& mount);
    // Replaces the record of mount.id; is_default can be set, not cleared. With another host it is the default of that
    // one only where that one had no mount. Throws InvalidRecord or NotFound.
    void Update(const Mount& mount);
    // Removes the record; the files stay. forget_events: removes the mount's events and saved marks first, in several
    // transactions, so that some may be gone when it throws StoreError; call it again. Throws NotFound; InvalidRecord
    // for the default while there are others, for a mount that a camera's plan names, and, without forget_events, for
    // one that holds events or saved marks.
    void Remove(int id, bool forget_events);
    // The first part of that: removes the rows, and leaves the mount. Throws as Remove does then.
    void ForgetEvents(int id);

    // Keeps later cameras and events from getting ids that footage on a mount has already: raises the counters to
    // these where they are below.
    void ReserveIds(int camera, int event);

    std::optional<Mount> Find(int id);
    // Where the host records a camera whose plan names that mount, or none for id 0: to that one where it has it, else
    // to its default, or that of the shared ones where it has no mount of its own. host 0: a single machine.
    std::optional<Mount> FindForPlan(int id, int host = 0);
    std::vector<Mount> List();  // by id

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
