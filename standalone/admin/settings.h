// SPDX-License-Identifier: Apache-2.0
//
// The settings of the whole installation: each with its default, its meaning and its bounds.
//
// Failures      Besides what its declaration names, each throws Forbidden and store::StoreError; nothing was changed
//               then.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

// The name of the setting without which this host shows no cameras of others.
inline constexpr const char* kCentralManagement = "cms";

struct Setting {
    enum class Kind {
        kNumber,
        kSwitch,
        kFolders,  // as in PATH; changed by the operator alone, for it bounds what an account can have written
        kToken,    // of which the store keeps a digest; made by the operator alone
    };

    const char* name;  // in the store, and on the command line but for the operator's
    Kind kind;
    int initial;  // of a number
    int min;
    int max;
    const char* meaning;
};

// All that may be set, in the order in which they are shown.
std::span<const Setting> Settings();

// {"name", "kind": "number"|"switch"|"folders"|"token", "value", "initial", "min", "max", "meaning", "operator",
// "revision"}. The value of a number is a number, of a switch a boolean, of folders their text, and of a token whether
// there is one. min and max are null where there are none. operator: only the command line may change it.
Json::Value SettingRecord(store::Store& store, const Setting& setting);

// Returns the record as stored. value: as in the record, but for a token. seen: the record's revision that the
// actor saw; nothing for whatever it is. Throws Stale; store::NotFound for an unknown name; store::InvalidRecord,
// which names the bounds, for another value; Forbidden for the operator's settings, unless the actor is the command
// line.
Json::Value SetSetting(store::Store& store, const Actor& actor, const std::string& name,
                       std::optional<std::int64_t> seen, const Json::Value& value);

// Replaces the monitors' token by a new one, which is returned and stored nowhere, or by none: then the text is empty.
// Only for the command line.
std::string SetMonitorToken(store::Store& store, const Actor& actor, bool is_new);

}  // namespace lookhaven::admin
