// SPDX-License-Identifier: Apache-2.0
//
// What accounts prefer, as clients remember it for them: one JSON object each. Names and values are the clients' own.
//
// Why so        No change of the installation: every account makes its own, and the audit log does not tell of them.
#pragma once

#include <cstddef>

#include <json/json.h>

#include "standalone/store/store.h"

namespace lookhaven::admin {

// The limit for all preferences of an account together, as base::OneLineJson writes them.
constexpr std::size_t kMaxPreferencesBytes = 16'384;
constexpr std::size_t kMaxPreferences = 64;
constexpr int kMaxPreferenceDepth = 8;

// Empty for an account that has none, and for an unknown one.
Json::Value PreferencesOf(store::Store& store, int user_id);

// Replaces each preference that changes names, as a whole; null removes it. The others stay, so that of two clients
// neither undoes what it has not changed. Returns all of them as they are then. Throws store::InvalidRecord for what is
// no object, a name that is not 1 to 64 bytes without control characters, and beyond those limits; store::NotFound for
// an unknown account; store::StoreError. Nothing was changed then.
Json::Value SetPreferences(store::Store& store, int user_id, const Json::Value& changes);

}  // namespace lookhaven::admin
