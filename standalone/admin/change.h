// SPDX-License-Identifier: Apache-2.0
//
// What every change of the installation goes through: the actor may make it, the record that was seen is still
// the current one, and the audit log has it.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

// What a change did, for the audit log. Neither record holds a secret; a revision is left out.
struct Change {
    std::string action;       // "camera.add"
    std::string object;       // as Named gives it
    Json::Value before = {};  // null where there was nothing
    Json::Value after = {};   // null where nothing is left
};

// Makes the change and its row in the audit log in one transaction, which is undone when make throws; no other Apply
// proceeds meanwhile. A change whose before and after are equal leaves no row. Throws Forbidden before make is called,
// StoreError, and what make throws.
void Apply(store::Store& store, const Actor& actor, const std::function<Change()>& make);

// The same for what accounts change of themselves alone, for which they need not be a manager's. That the actor's
// account still exists is for make to see.
void ApplyToSelf(store::Store& store, const Actor& actor, const std::function<Change()>& make);

// "Gate (3)"
std::string Named(const std::string& name, int id);

// What changes whenever the record does: a hash of its members, but for one called "revision". Below 2^48, which
// JavaScript holds exactly.
std::int64_t RevisionOf(const Json::Value& record);

// Someone else changed the record since it was read; nothing was changed.
class Stale : public std::runtime_error {
  public:
    explicit Stale(Json::Value record)
        : std::runtime_error("somebody else has changed this in the meantime"),
          record_(std::move(record)) {}
    const Json::Value& Record() const { return record_; }  // as it is now

  private:
    Json::Value record_;
};

// What was to go, or to be otherwise, is needed as it is, as the text says; nothing was changed.
class StillNeeded : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// record: with its member "revision". Throws Stale where a revision was seen and that is another. Call it inside of
// Apply.
void RequireCurrent(const Json::Value& record, std::optional<std::int64_t> seen);

}  // namespace lookhaven::admin
