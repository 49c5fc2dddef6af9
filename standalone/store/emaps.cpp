// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/emaps.h"

#include <algorithm>
#include <cstdlib>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<Emap> {
    static constexpr const char* kTable = "emaps";
    static constexpr const char* kColumns = "id, name, image, hide_names, small_items, revision";
    static auto Members(auto& emap) {
        return std::tie(emap.id, emap.name, emap.image, emap.hide_names, emap.small_items, emap.revision);
    }
};

template <>
struct Mapping<EmapSummary> {
    static constexpr const char* kTable = "emaps";
    static constexpr const char* kColumns = "id, name, image, hide_names, small_items, revision,"
                                            " (select count(*) from emap_items where emap_id = emaps.id)";
    static auto Members(auto& emap) { return std::tuple_cat(Mapping<Emap>::Members(emap), std::tie(emap.item_count)); }
};

template <>
struct Mapping<EmapItem> {
    static constexpr const char* kTable = "emap_items";
    static constexpr const char* kColumns =
        "type, device_id, name, server_id, x, y, direction, text_pos, icon_center_x,"
        " icon_center_y, port";
    static auto Members(auto& item) {
        return std::tie(item.type, item.device_id, item.name, item.server_id, item.x, item.y, item.direction,
                        item.text_pos, item.icon_center_x, item.icon_center_y, item.port);
    }
};

using ItemRow = std::tuple<int, int, EmapItem>;  // of which map, at which place

template <>
struct Mapping<ItemRow> {
    static constexpr const char* kTable = "emap_items";
    static inline const std::string kColumns = std::string("emap_id, place, ") + Mapping<EmapItem>::kColumns;
};

namespace {

constexpr std::size_t kMaxItemNameBytes = 255;
constexpr int kMaxPixel = 100'000;
constexpr int kMaxPortIndex = 255;

Emap RequireEmap(soci::session& sql, int id) {
    return Require(FetchOne<Emap>(sql, "where id = :id", id), "e-map", id);
}

void RequireFreeName(soci::session& sql, const Emap& emap) {
    store::RequireFreeName(sql, "emaps", "an e-map", emap.id, emap.name);
}

std::vector<EmapItem> FetchItems(soci::session& sql, int id) {
    return FetchAll<EmapItem>(sql, "where emap_id = :id order by place", id);
}

bool SameDevice(const EmapItem& one, const EmapItem& other) {
    return one.type == other.type && one.device_id == other.device_id && one.server_id == other.server_id;
}

bool HasDevice(soci::session& sql, const EmapItem& item) {
    switch (item.type) {
    case EmapItemType::kEmap:
        return item.server_id == 0 && Exists(sql, "select id from emaps where id = :id", item.device_id);
    case EmapItemType::kCamera:
        return item.server_id == 0
                   ? Exists(sql, "select id from cameras where id = :id", item.device_id)
                   : Exists(sql, "select id from remote_cameras where server_id = :server and id_on_server = :id",
                            item.server_id, item.device_id);
    default:
        return Exists(sql, "select id from devices where kind = :kind and server_id = :server and id_on_server = :id",
                      item.type, item.server_id, item.device_id);
    }
}

void RequireDevice(soci::session& sql, const EmapItem& item) {
    if (!HasDevice(sql, item)) {
        constexpr const char* kNames[] = {"camera", "e-map", "door", "I/O module", "POS terminal"};
        throw NotFound(std::string("there is no ") + kNames[static_cast<int>(item.type)] + " " +
                       std::to_string(item.device_id) +
                       (item.server_id == 0 ? "" : " on paired host " + std::to_string(item.server_id)));
    }
}

void RequireValid(const EmapItem& item) {
    if (item.type < EmapItemType::kCamera || item.type > EmapItemType::kPos) {
        throw InvalidRecord("an e-map item is a camera, an e-map, a door, an I/O module or a POS terminal");
    }
    if (!IsPlainText(item.name, kMaxItemNameBytes)) {
        throw InvalidRecord("an e-map item's name is up to 255 bytes of UTF-8 without control characters");
    }
    for (const int pixel : {item.x, item.y, item.icon_center_x, item.icon_center_y}) {
        if (pixel < -kMaxPixel || pixel > kMaxPixel) {
            throw InvalidRecord("an e-map item lies within 100000 pixels of the picture");
        }
    }
    if (item.direction < 0 || item.direction > 359) {
        throw InvalidRecord("an e-map item's direction is 0 to 359 degrees");
    }
    if (item.text_pos < 0 || item.text_pos > 3) {
        throw InvalidRecord("an e-map item's name stands below (0), above (1), left (2) or right (3)");
    }
    if (item.port < -1 || item.port > kMaxPortIndex) {
        throw InvalidRecord("an e-map item's port is -1 for the whole device, or 0 to 255");
    }
}

void SetFlags(soci::session& sql, const Emap& emap) {
    Execute(sql, "update emaps set hide_names = :hide, small_items = :small where id = :id", emap.hide_names,
            emap.small_items, emap.id);
}

void RaiseMapRevision(soci::session& sql, int id) {
    Execute(sql, "update emaps set revision = revision + 1 where id = :id", id);
}

}  // namespace

int Emaps::Add(const Emap& emap) {
    return connection_.Write([&](soci::session& sql) {
        Emap added = emap;
        added.id = NextId(sql, "emap");
        RequireFreeName(sql, added);
        added.image = "";
        added.revision = 1;
        Insert(sql, added);
        RaiseRevision(sql);
        return added.id;
    });
}

void Emaps::Update(const Emap& emap) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RaiseMapRevision(sql, emap.id);  // first, so that no other change comes between
        RequireEmap(sql, emap.id);
        RequireFreeName(sql, emap);
        Execute(sql, "update emaps set name = :name where id = :id", emap.name, emap.id);
        SetFlags(sql, emap);
    });
}

void Emaps::SetImage(int id, const std::string& image) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RaiseMapRevision(sql, id);
        RequireEmap(sql, id);
        Execute(sql, "update emaps set image = :image where id = :id", image, id);
    });
}

void Emaps::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireEmap(sql, id);
        Execute(sql, "delete from emaps where id = :id", id);
    });
}

std::optional<Emap> Emaps::Find(int id) {
    return connection_.FetchOne<Emap>("where id = :id", id);
}

std::vector<EmapSummary> Emaps::List() {
    return connection_.FetchAll<EmapSummary>("order by id");
}

std::vector<EmapItem> Emaps::Items(int id) {
    return connection_.Read([&](soci::session& sql) { return FetchItems(sql, id); });
}

std::map<int, std::set<int>> Emaps::Links() {
    return connection_.Read([](soci::session& sql) {
        std::map<int, std::set<int>> links;
        const EmapItemType kind = EmapItemType::kEmap;
        Query<std::tuple<int, int>>(
            sql, kOnce, "select device_id, emap_id from emap_items where type = :type and server_id = 0", kind)
            .ForEach([&links](const auto& row) { links[std::get<0>(row)].insert(std::get<1>(row)); });
        return links;
    });
}

bool Emaps::Knows(const EmapItem& item) {
    return connection_.Read([&](soci::session& sql) { return HasDevice(sql, item); });
}

int Emaps::ReplaceItems(const Emap& emap, const std::vector<EmapItem>& items) {
    if (items.size() > kMaxEmapItems) {
        throw InvalidRecord("an e-map holds at most 1000 items");
    }
    std::ranges::for_each(items, RequireValid);
    return connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RaiseMapRevision(sql, emap.id);
        const int revision = RequireEmap(sql, emap.id).revision;
        if (revision - 1 != emap.revision) {
            throw Conflict("the e-map " + std::to_string(emap.id) + " was changed by someone else");
        }
        SetFlags(sql, emap);
        const std::vector<EmapItem> before = FetchItems(sql, emap.id);
        Execute(sql, "delete from emap_items where emap_id = :id", emap.id);
        int place = 0;
        for (const EmapItem& item : items) {
            if (std::ranges::none_of(before, [&](const EmapItem& old) { return SameDevice(old, item); })) {
                RequireDevice(sql, item);
            }
            Insert(sql, ItemRow(emap.id, place++, item));
        }
        return revision;
    });
}

}  // namespace lookhaven::store
