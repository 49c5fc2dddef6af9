// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/emaps.h"

#include <set>

#include "standalone/admin/change.h"
#include "standalone/base/log.h"
#include "standalone/emap/item_json.h"
#include "standalone/emap/pictures.h"

namespace lookhaven::admin {

namespace {

using store::Emap;
using store::Emaps;

constexpr std::size_t kMaxEmaps = 500;

// A picture's file, written before its change begins since a disk may be slow while the store is locked. Goes with this
// object unless it is kept, or a map has it all the same.
class NewPicture {
  public:
    NewPicture(store::Store& store, const std::filesystem::path& home, const emap::MapPicture& picture)
        : pictures_(store, home),
          name_(pictures_.Write(picture.File())) {}
    NewPicture(const NewPicture&) = delete;
    NewPicture& operator=(const NewPicture&) = delete;
    ~NewPicture() {
        try {
            if (!is_kept_) {
                pictures_.Withdraw(name_);
            }
        } catch (const std::exception&) {
            // The next Sweep finds it.
        }
    }

    const std::string& Name() const { return name_; }

    void Keep() { is_kept_ = true; }  // a map has it

  private:
    emap::Pictures pictures_;
    const std::string name_;
    bool is_kept_ = false;
};

// The change is made by now, and must not fail for what it leaves behind: the next one sweeps again.
void Sweep(emap::Pictures& pictures) {
    try {
        pictures.Sweep();
    } catch (const std::exception& error) {
        base::LogWarning(std::string("pictures that no e-map has are left: ") + error.what());
    }
}

// The items that are not among the others.
Json::Value Without(const Json::Value& items, const Json::Value& others) {
    const std::set<Json::Value> known(others.begin(), others.end());
    Json::Value rest = Json::arrayValue;
    for (const Json::Value& item : items) {
        if (!known.contains(item)) {
            rest.append(item);
        }
    }
    return rest;
}

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
    RequireManager(store, actor);
    Emap emap;
    emap::Pictures pictures(store, home);
    Sweep(pictures);  // what cut uploads have left, which nothing else bounds
    NewPicture picture(store, home, change.picture.value());
    Apply(store, actor, [&] {
        Emaps emaps(store);
        if (emaps.List().size() >= kMaxEmaps) {
            throw store::InvalidRecord("there are at most " + std::to_string(kMaxEmaps) + " e-maps");
        }
        const int id = emaps.Add({.name = change.name.value_or(""),
                                  .hide_names = change.hide_names.value_or(false),
                                  .small_items = change.small_items.value_or(false)});
        emaps.SetImage(id, picture.Name());
        emap = RequireEmap(store, id);
        return Change{"emap.add", Named(emap.name, id), {}, EmapRecord(emap)};
    });
    picture.Keep();
    return emap;
}

Emap SetEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, int id,
             std::optional<std::int64_t> seen, const EmapChange& change) {
    RequireManager(store, actor);
    Emap emap;
    emap::Pictures pictures(store, home);
    std::optional<NewPicture> picture;
    if (change.picture) {
        Sweep(pictures);
        picture.emplace(store, home, *change.picture);
        pictures.Touch(RequireEmap(store, id).image);
    }
    Apply(store, actor, [&] {
        const Emap before = RequireEmap(store, id);
        RequireCurrent(EmapRecord(before), seen);
        emap = before;
        emap.name = change.name.value_or(before.name);
        emap.hide_names = change.hide_names.value_or(before.hide_names);
        emap.small_items = change.small_items.value_or(before.small_items);
        Emaps(store).Update(emap);
        if (picture) {
            Emaps(store).SetImage(id, picture->Name());
        }
        emap = RequireEmap(store, id);
        return Change{"emap.set", Named(emap.name, id), EmapRecord(before), EmapRecord(emap)};
    });
    if (picture) {
        picture->Keep();
        Sweep(pictures);
    }
    return emap;
}

int PlaceItems(store::Store& store, const Actor& actor, const Emap& emap, const std::vector<store::EmapItem>& items) {
    Emap placed;
    Apply(store, actor, [&] {
        const Emap before = RequireEmap(store, emap.id);
        const Json::Value old_items = emap::ToJson(Emaps(store).Items(emap.id));
        Emaps(store).ReplaceItems(emap, items);
        placed = RequireEmap(store, emap.id);
        const Json::Value new_items = emap::ToJson(Emaps(store).Items(emap.id));
        Change change{"emap.place", Named(before.name, emap.id), EmapRecord(before), EmapRecord(placed)};
        change.before["items"] = Without(old_items, new_items);
        change.after["items"] = Without(new_items, old_items);
        // Another order, or one of two that are alike.
        if (change.before["items"] == change.after["items"] && old_items != new_items) {
            change.before["items"] = old_items;
            change.after["items"] = new_items;
        }
        return change;
    });
    return placed.revision;
}

void RemoveEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, int id,
                std::optional<std::int64_t> seen) {
    RequireManager(store, actor);
    emap::Pictures pictures(store, home);
    pictures.Touch(RequireEmap(store, id).image);
    Apply(store, actor, [&] {
        const Emap emap = RequireEmap(store, id);
        RequireCurrent(EmapRecord(emap), seen);
        Emaps(store).Remove(id);
        return Change{"emap.remove", Named(emap.name, id), EmapRecord(emap), {}};
    });
    Sweep(pictures);
}

}  // namespace lookhaven::admin
