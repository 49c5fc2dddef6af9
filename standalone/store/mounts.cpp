// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/mounts.h"

#include <filesystem>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<Mount> {
    static constexpr const char* kTable = "mounts";
    static constexpr const char* kColumns = "id, name, path, max_bytes, max_age, enabled, is_default, host_id";
    static auto Members(auto& mount) {
        return std::tie(mount.id, mount.name, mount.path, mount.max_bytes, mount.max_age_s, mount.enabled,
                        mount.is_default, mount.host_id);
    }
};

namespace {

constexpr std::size_t kMaxPathBytes = 1024;
constexpr int kRowsPerBatch = 10'000;
constexpr int kMaxReservedEvent = 1 << 30;

std::vector<Mount> FetchMounts(soci::session& sql) {
    return FetchAll<Mount>(sql, "order by id");
}

Mount RequireMount(soci::session& sql, int id) {
    return Require(FetchOne<Mount>(sql, "where id = :id", id), "mount", id);
}

bool IsFolderPath(const std::string& path) {
    return IsPlainText(path, kMaxPathBytes) && path.size() > 1 && path.front() == '/' && path.back() != '/' &&
           std::filesystem::path(path).lexically_normal().native() == path;
}

bool IsInside(const std::string& inner, const std::string& outer) {
    return (inner + "/").starts_with(outer + "/");
}

// Whether one machine may have both.
bool MayMeet(const Mount& one, const Mount& other) {
    return one.IsOf(other.host_id) || other.IsShared();
}

bool HasMounts(soci::session& sql, int host) {
    return Exists(sql, "select id from mounts where host_id = :host", host);
}

void RequireValid(soci::session& sql, const Mount& mount) {
    RequireFreeName(sql, "mounts", "a mount", mount.id, mount.name);
    if (!IsFolderPath(mount.path)) {
        throw InvalidRecord("a mount's path begins with /, holds no . or .. and has at most 1024 bytes");
    }
    if (mount.max_bytes < 0 || mount.max_age_s < 0) {
        throw InvalidRecord("a mount's limits are not below 0");
    }
    for (const Mount& other : FetchMounts(sql)) {
        if (other.id != mount.id && MayMeet(other, mount) &&
            (IsInside(mount.path, other.path) || IsInside(other.path, mount.path))) {
            throw AlreadyExists("the mount \"" + other.name + "\" at " + other.path + " and " + mount.path +
                                " would lie inside each other");
        }
    }
}

void KeepOneDefault(soci::session& sql, const Mount& mount) {
    if (mount.is_default) {
        Execute(sql, "update mounts set is_default = 0 where id <> :id and host_id = :host", mount.id, mount.host_id);
    }
}

int CountRows(soci::session& sql, const std::string& table, int mount_id) {
    return FetchOne<int>(sql, "select count(*) from " + table + " where mount_id = :id", mount_id).value();
}

void RequireFree(soci::session& sql, const Mount& mount) {
    if (CountRows(sql, "recording_plans", mount.id) > 0) {
        throw InvalidRecord("cameras record to the mount \"" + mount.name + "\": give them another one first");
    }
    if (mount.is_default &&
        Exists(sql, "select id from mounts where host_id = :host and id <> :id", mount.host_id, mount.id)) {
        throw InvalidRecord("the mount \"" + mount.name + "\" is the default: make another one the default first");
    }
}

// In steps that do not hold up other writers for long.
void ForgetRows(Connection& connection, int id) {
    for (const char* statement :
         {"delete from events where id in (select id from events where mount_id = :id limit :limit)",
          "delete from marks where id in (select id from marks where mount_id = :id limit :limit)"}) {
        while (connection.Execute(statement, id, kRowsPerBatch) > 0) {
        }
    }
}

}  // namespace

int Mounts::Add(const Mount& mount) {
    return connection_.Write([&](soci::session& sql) {
        Mount added = mount;
        added.id = NextId(sql, "mount");
        RaiseRevision(sql);
        added.is_default = added.is_default || !HasMounts(sql, added.host_id);
        RequireValid(sql, added);
        KeepOneDefault(sql, added);
        Insert(sql, added);
        return added.id;
    });
}

void Mounts::Update(const Mount& mount) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Mount changed = mount;
        const Mount before = RequireMount(sql, mount.id);
        changed.is_default =
            before.host_id == mount.host_id ? before.is_default || mount.is_default : !HasMounts(sql, mount.host_id);
        RequireValid(sql, changed);
        KeepOneDefault(sql, changed);
        store::Update(sql, changed);
        if (before.is_default && before.host_id != mount.host_id) {
            Execute(sql,
                    "update mounts set is_default = 1 where id = (select min(id) from mounts where host_id = :host)",
                    before.host_id);
        }
    });
}

void Mounts::ForgetEvents(int id) {
    connection_.Write([&](soci::session& sql) { RequireFree(sql, RequireMount(sql, id)); });
    ForgetRows(connection_, id);
}

void Mounts::Remove(int id, bool forget_events) {
    if (forget_events) {
        ForgetEvents(id);
    }
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        const Mount mount = RequireMount(sql, id);
        RequireFree(sql, mount);
        const int held = CountRows(sql, "events", id) + CountRows(sql, "marks", id);
        if (held > 0) {
            throw InvalidRecord("the mount \"" + mount.name + "\" holds " + std::to_string(held) + " recordings");
        }
        Execute(sql, "delete from events_pending_deletion where mount_id = :id", id);
        Execute(sql, "delete from mounts where id = :id", id);
    });
}

void Mounts::ReserveIds(int camera, int event) {
    // Otherwise one file name could leave no ids for this installation's own events.
    event = event > kMaxReservedEvent ? 0 : event;
    connection_.Write([&](soci::session& sql) {
        for (const auto& [counter, id] : {std::pair("camera", camera), std::pair("event", event)}) {
            Execute(sql, "update counters set value = :id where name = :name and value < :at_least", id,
                    std::string(counter), id);
        }
    });
}

std::optional<Mount> Mounts::Find(int id) {
    return connection_.FetchOne<Mount>("where id = :id", id);
}

std::optional<Mount> Mounts::FindForPlan(int id, int host) {
    if (id != 0) {
        std::optional<Mount> named = Find(id);
        if (!named ? host == 0 : named->IsOf(host)) {
            return named;
        }
    }
    return connection_.FetchOne<Mount>(
        "where is_default = 1 and host_id in (:host, :all) order by host_id desc limit 1", host, kAllHosts);
}

std::vector<Mount> Mounts::List() {
    return connection_.Read(FetchMounts);
}

}  // namespace lookhaven::store
