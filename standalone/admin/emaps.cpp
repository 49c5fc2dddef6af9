// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/emaps.h"

#include <set>

#include "standalone/admin/change.h"
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

    // Once a map has it instead of the other picture, which may be empty.
    void Keep(const std::string& replaced) {
        is_kept_ = true;
        pictures_.Retire(replaced);
    }

  private:
    emap::Pictures pictures_;
    const std::string name_;
    bool is_kept_ = false;
};

// The map, with those of its items that are not among the others.
Json::Value RecordOfPlaces(const Emap& emap, const Json::Value& items, const Json::Value& others) {
    const std::set<Json::Value> known(others.begin(), others.end());
    Json::Value record = EmapRecord(emap);
    record["items"] = Json::arrayValue;
    for (const Json::Value& item : items) {
        if (!known.contains(item)) {
            record["items"].append(item);
        }
    }
    return record;
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
    picture.Keep("");
    return emap;
}

Emap SetEmap(store::Store& store, const Actor& actor, const std::filesystem::path& home, int id,
             std::optional<std::int64_t> seen, const EmapChange& change) {
    RequireManager(store, actor);
    Emap before;
    Emap emap;
    std::optional<NewPicture> picture;
    if (change.picture) {
        picture.emplace(store, home, *change.picture);
    }
    Apply(store, actor, [&] {
        before = RequireEmap(store, id);
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
        picture->Keep(before.image);
    }
    return emap;
}

int PlaceItems(store::Store& store, const Actor& actor, const Emap& emap, const std::vector<store::EmapItem>& items) {
    int revision = 0;
    Apply(store, actor, [&] {
        const Emap before = RequireEmap(store, emap.id);
        const Json::Value old_items = emap::ToJson(Emaps(store).Items(emap.id));
        revision = Emaps(store).ReplaceItems(emap, items);
        const Json::Value new_items = emap::ToJson(Emaps(store).Items(emap.id));
        return Change{"emap.place", Named(before.name, emap.id), RecordOfPlaces(before, old_items, new_items),
                      RecordOfPlaces(RequireEmap(store, emap.id), new_items, old_items)};
    });
    return revision;
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
