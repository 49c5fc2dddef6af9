// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/emaps.h"

#include <algorithm>
#include <cstdlib>
#include <limits>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxNameBytes = 64;
constexpr std::size_t kMaxItemNameBytes = 255;
constexpr int kMaxPixel = 100'000;
constexpr int kMaxPortIndex = 255;

std::vector<EmapSummary> Fetch(soci::session& sql, int first, int last) {
    EmapSummary emap;
    int hide_names = 0;
    int small_items = 0;
    soci::statement rows = (sql.prepare << "select id, name, image, hide_names, small_items, revision,"
                                           " (select count(*) from emap_items where emap_id = emaps.id) from emaps"
                                           " where id >= :first and id <= :last order by id",
                            soci::use(first, "first"), soci::use(last, "last"), soci::into(emap.id),
                            soci::into(emap.name), soci::into(emap.image), soci::into(hide_names),
                            soci::into(small_items), soci::into(emap.revision), soci::into(emap.item_count));
    rows.execute();
    std::vector<EmapSummary> emaps;
    while (rows.fetch()) {
        emap.hide_names = hide_names != 0;
        emap.small_items = small_items != 0;
        emaps.push_back(emap);
    }
    return emaps;
}

Emap Require(soci::session& sql, int id) {
    const std::vector<EmapSummary> found = Fetch(sql, id, id);
    if (found.empty()) {
        throw NotFound("there is no e-map " + std::to_string(id));
    }
    return found.front();
}

void RequireFreeName(soci::session& sql, const Emap& emap) {
    if (emap.name.empty() || !IsPlainText(emap.name, kMaxNameBytes)) {
        throw InvalidRecord("an e-map's name is 1 to 64 bytes of UTF-8 without control characters");
    }
    int found = 0;
    sql << "select id from emaps where name = :name and id <> :id", soci::use(emap.name, "name"),
        soci::use(emap.id, "id"), soci::into(found);
    if (sql.got_data()) {
        throw AlreadyExists("there is already an e-map \"" + emap.name + "\"");
    }
}

std::vector<EmapItem> FetchItems(soci::session& sql, int id) {
    EmapItem item;
    int type = 0;
    soci::statement rows =
        (sql.prepare << "select type, device_id, name, server_id, x, y, direction, text_pos, icon_center_x,"
                        " icon_center_y, port from emap_items where emap_id = :id order by place",
         soci::use(id, "id"), soci::into(type), soci::into(item.device_id), soci::into(item.name),
         soci::into(item.server_id), soci::into(item.x), soci::into(item.y), soci::into(item.direction),
         soci::into(item.text_pos), soci::into(item.icon_center_x), soci::into(item.icon_center_y),
         soci::into(item.port));
    rows.execute();
    std::vector<EmapItem> items;
    while (rows.fetch()) {
        item.type = static_cast<EmapItemType>(type);
        items.push_back(item);
    }
    return items;
}

bool SameDevice(const EmapItem& one, const EmapItem& other) {
    return one.type == other.type && one.device_id == other.device_id && one.server_id == other.server_id;
}

const char* DeviceQuery(const EmapItem& item) {
    switch (item.type) {
    case EmapItemType::kEmap:
        return "select id from emaps where id = :id and :server = 0 and :kind >= 0";
    case EmapItemType::kCamera:
        return item.server_id == 0 ? "select id from cameras where id = :id and :server = 0 and :kind >= 0"
                                   : "select id from remote_cameras where id_on_server = :id and server_id = :server"
                                     " and :kind >= 0";
    default:
        return "select id from devices where id_on_server = :id and server_id = :server and kind = :kind";
    }
}

bool HasDevice(soci::session& sql, const EmapItem& item) {
    int found = 0;
    const int kind = static_cast<int>(item.type);
    sql << DeviceQuery(item), soci::use(item.device_id, "id"), soci::use(item.server_id, "server"),
        soci::use(kind, "kind"), soci::into(found);
    return sql.got_data();
}

void RequireDevice(soci::session& sql, const EmapItem& item) {
    if (!HasDevice(sql, item)) {
        constexpr const char* kNames[] = {"camera", "e-map", "door", "I/O module", "POS terminal"};
        throw NotFound(std::string("there is no ") + kNames[static_cast<int>(item.type)] + " " +
                       std::to_string(item.device_id) +
                       (item.server_id == 0 ? "" : " on server " + std::to_string(item.server_id)));
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

void InsertItem(soci::session& sql, int id, int place, const EmapItem& item) {
    const int type = static_cast<int>(item.type);
    sql << "insert into emap_items (emap_id, place, type, device_id, name, server_id, x, y, direction, text_pos,"
           " icon_center_x, icon_center_y, port) values (:emap, :place, :type, :device, :name, :server, :x, :y,"
           " :direction, :text_pos, :center_x, :center_y, :port)",
        soci::use(id, "emap"), soci::use(place, "place"), soci::use(type, "type"), soci::use(item.device_id, "device"),
        soci::use(item.name, "name"), soci::use(item.server_id, "server"), soci::use(item.x, "x"),
        soci::use(item.y, "y"), soci::use(item.direction, "direction"), soci::use(item.text_pos, "text_pos"),
        soci::use(item.icon_center_x, "center_x"), soci::use(item.icon_center_y, "center_y"),
        soci::use(item.port, "port");
}

void SetFlags(soci::session& sql, const Emap& emap) {
    const int hide_names = emap.hide_names ? 1 : 0;
    const int small_items = emap.small_items ? 1 : 0;
    sql << "update emaps set hide_names = :hide, small_items = :small where id = :id", soci::use(hide_names, "hide"),
        soci::use(small_items, "small"), soci::use(emap.id, "id");
}

void RaiseMapRevision(soci::session& sql, int id) {
    sql << "update emaps set revision = revision + 1 where id = :id", soci::use(id, "id");
}

}  // namespace

int Emaps::Add(const Emap& emap) {
    return connection_.Write([&](soci::session& sql) {
        Emap added = emap;
        added.id = NextId(sql, "emap");
        RequireFreeName(sql, added);
        sql << "insert into emaps (id, name, image, hide_names, small_items, revision) values (:id, :name, '', 0, 0, "
               "1)",
            soci::use(added.id, "id"), soci::use(added.name, "name");
        SetFlags(sql, added);
        RaiseRevision(sql);
        return added.id;
    });
}

void Emaps::Update(const Emap& emap) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RaiseMapRevision(sql, emap.id);  // first, so that no other change comes between
        Require(sql, emap.id);
        RequireFreeName(sql, emap);
        sql << "update emaps set name = :name where id = :id", soci::use(emap.name, "name"), soci::use(emap.id, "id");
        SetFlags(sql, emap);
    });
}

void Emaps::SetImage(int id, const std::string& image) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RaiseMapRevision(sql, id);
        Require(sql, id);
        sql << "update emaps set image = :image where id = :id", soci::use(image, "image"), soci::use(id, "id");
    });
}

void Emaps::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(sql, id);
        sql << "delete from emaps where id = :id", soci::use(id, "id");
    });
}

std::optional<Emap> Emaps::Find(int id) {
    const std::vector<EmapSummary> found = connection_.Read([&](soci::session& sql) { return Fetch(sql, id, id); });
    return found.empty() ? std::nullopt : std::optional<Emap>(found.front());
}

std::vector<EmapSummary> Emaps::List() {
    return connection_.Read([](soci::session& sql) { return Fetch(sql, 1, std::numeric_limits<int>::max()); });
}

std::vector<EmapItem> Emaps::Items(int id) {
    return connection_.Read([&](soci::session& sql) { return FetchItems(sql, id); });
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
        const int revision = Require(sql, emap.id).revision;
        if (revision - 1 != emap.revision) {
            throw Conflict("the e-map " + std::to_string(emap.id) + " was changed by someone else");
        }
        SetFlags(sql, emap);
        const std::vector<EmapItem> before = FetchItems(sql, emap.id);
        sql << "delete from emap_items where emap_id = :id", soci::use(emap.id, "id");
        int place = 0;
        for (const EmapItem& item : items) {
            if (std::ranges::none_of(before, [&](const EmapItem& old) { return SameDevice(old, item); })) {
                RequireDevice(sql, item);
            }
            InsertItem(sql, emap.id, place++, item);
        }
        return revision;
    });
}

}  // namespace lookhaven::store
