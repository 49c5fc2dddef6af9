// SPDX-License-Identifier: Apache-2.0
//
// Changes of e-maps and of what is placed on them.
//
// Failures      Each throws Forbidden, Stale, store::NotFound, store::InvalidRecord, store::AlreadyExists,
//               store::StoreError, and std::system_error where a picture cannot be written; nothing was changed then.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/emap/map_picture.h"
#include "standalone/store/emaps.h"

namespace lookhaven::admin {

// What is to be different; what is empty stays.
struct EmapChange {
    std::optional<std::string> name = {};
    std::optional<bool> hide_names = {};
    std::optional<bool> small_items = {};
    std::optional<emap::MapPicture> picture = {};
};

// {"id", "name", "hideItemName", "smallItemSize", "picture", "revision"}. The picture is the name of its file, another
// one for each picture; empty where there is none. The revision grows with every change of the map or its items.
Json::Value EmapRecord(const store::Emap& emap);

// Throws store::NotFound.
store::Emap RequireEmap(store::Store& store, int id);

// home: the state folder. These two return the map as it is then. Name and picture are given when adding.
store::Emap AddEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home,
                    const EmapChange& change);
// seen: the map's revision that the actor saw; nothing for whatever it is.
store::Emap SetEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, int id,
                    std::optional<std::int64_t> seen, const EmapChange& change);
// Replaces all items and both flags of the map, and returns its new revision, as store::Emaps::ReplaceItems does, whose
// Conflict it throws too.
int PlaceItems(store::Store& store, const Actor& actor, const store::Emap& emap,
               const std::vector<store::EmapItem>& items);
// With its items and its picture. Links to it stay on other maps until these are changed, and no longer work.
void RemoveEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, int id,
                std::optional<std::int64_t> seen);

}  // namespace lookhaven::admin
