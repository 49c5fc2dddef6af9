// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/emaps.h"

#include "standalone/admin/change.h"
#include "standalone/emap/pictures.h"

namespace lookhaven::admin {

namespace {

using store::Emap;
using store::Emaps;

}  // namespace

Json::Value EmapRecord(const Emap& emap) {
    Json::Value json;
    json["id"] = emap.id;
    json["name"] = emap.name;
    json["hideItemName"] = emap.hide_names;
    json["smallItemSize"] = emap.small_items;
    json["picture"] = emap.image;
    json["revision"] = emap.revision;
    return json;
}

Emap RequireEmap(store::Store& store, int id) {
    std::optional<Emap> emap = Emaps(store).Find(id);
    if (!emap) {
        throw store::NotFound("there is no e-map " + std::to_string(id));
    }
    return *std::move(emap);
}

Emap AddEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, const EmapChange& change) {
    Emap emap;
    Apply(store, actor, [&] {
        const int id = Emaps(store).Add({.name = change.name.value_or(""),
                                         .hide_names = change.hide_names.value_or(false),
                                         .small_items = change.small_items.value_or(false)});
        emap::Pictures(store, home).Put(id, change.picture.value().File());
        emap = RequireEmap(store, id);
        return Change{"emap.add", Named(emap.name, id), {}, EmapRecord(emap)};
    });
    return emap;
}

Emap SetEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, int id,
             std::optional<std::int64_t> seen, const EmapChange& change) {
    Emap emap;
    Apply(store, actor, [&] {
        const Emap before = RequireEmap(store, id);
        RequireCurrent(EmapRecord(before), seen);
        emap = before;
        emap.name = change.name.value_or(before.name);
        emap.hide_names = change.hide_names.value_or(before.hide_names);
        emap.small_items = change.small_items.value_or(before.small_items);
        Emaps(store).Update(emap);
        if (change.picture) {
            emap::Pictures(store, home).Put(id, change.picture->File());
        }
        emap = RequireEmap(store, id);
        return Change{"emap.set", Named(emap.name, id), EmapRecord(before), EmapRecord(emap)};
    });
    return emap;
}

void RemoveEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, int id,
                std::optional<std::int64_t> seen) {
    Apply(store, actor, [&] {
        const Emap emap = RequireEmap(store, id);
        RequireCurrent(EmapRecord(emap), seen);
        Emaps(store).Remove(id);
        return Change{"emap.remove", Named(emap.name, id), EmapRecord(emap), {}};
    });
    emap::Pictures(store, home).Sweep();
}

}  // namespace lookhaven::admin
