// SPDX-License-Identifier: Apache-2.0
//
// Camera groups. What a user is denied of a group is in users.h.
#pragma once

#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/store/store.h"

namespace lookhaven::store {

struct CameraGroup {
    int id = 0;                // from 1, never used twice
    std::string name;          // UTF-8, 1 to 64 bytes, no other group's
    std::set<int> camera_ids;  // those that were removed stay, for their recordings do
};

// Invariants    (1) Every change raises Settings::Revision() in the same transaction.
//               (2) A change that adds a camera to a group ends the sessions of the users to whom the group is denied.
class Groups {
  public:
    // The store must outlive this object.
    explicit Groups(Store& store) : connection_(store.connection()) {}

    // Stores the record under a new id, which it returns. Throws InvalidRecord, AlreadyExists, or NotFound for an
    // unknown camera.
    int Add(const CameraGroup& group);
    // Replaces the record of group.id. Throws as Add, and NotFound for an unknown group.
    void Update(const CameraGroup& group);
    // Removes the group and what is denied of it. Throws NotFound.
    void Remove(int id);

    std::optional<CameraGroup> Find(int id);
    std::vector<CameraGroup> List();  // by id
    // Names of the users to whom something of the group is denied, sorted.
    std::vector<std::string> DeniedTo(int id);

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
