// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/mounts.h"

#include <filesystem>
#include <limits>
#include <utility>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxNameBytes = 64;
constexpr std::size_t kMaxPathBytes = 1024;
constexpr int kRowsAtOnce = 10'000;

// SOCI binds long long, whatever std::int64_t is.
using Number = long long;

std::vector<Mount> Fetch(soci::session& sql, int first, int last) {
    Mount mount;
    Number max_bytes = 0;
    Number max_age = 0;
    int enabled = 0;
    int is_default = 0;
    soci::statement rows = (sql.prepare << "select id, name, path, max_bytes, max_age, enabled, is_default from mounts"
                                           " where id >= :first and id <= :last order by id",
                            soci::use(first, "first"), soci::use(last, "last"), soci::into(mount.id),
                            soci::into(mount.name), soci::into(mount.path), soci::into(max_bytes), soci::into(max_age),
                            soci::into(enabled), soci::into(is_default));
    rows.execute();
    std::vector<Mount> mounts;
    while (rows.fetch()) {
        mount.max_bytes = max_bytes;
        mount.max_age_s = max_age;
        mount.enabled = enabled != 0;
        mount.is_default = is_default != 0;
        mounts.push_back(mount);
    }
    return mounts;
}

std::vector<Mount> FetchAll(soci::session& sql) {
    return Fetch(sql, 1, std::numeric_limits<int>::max());
}

Mount Require(soci::session& sql, int id) {
    std::vector<Mount> found = Fetch(sql, id, id);
    if (found.empty()) {
        throw NotFound("there is no mount " + std::to_string(id));
    }
    return std::move(found.front());
}

bool IsFolderPath(const std::string& path) {
    return IsPlainText(path, kMaxPathBytes) && path.size() > 1 && path.front() == '/' && path.back() != '/' &&
           std::filesystem::path(path).lexically_normal().native() == path;
}

bool IsInside(const std::string& inner, const std::string& outer) {
    return (inner + "/").starts_with(outer + "/");
}

void RequireMount(const Mount& mount, const std::vector<Mount>& all) {
    if (mount.name.empty() || !IsPlainText(mount.name, kMaxNameBytes)) {
        throw InvalidRecord("a mount's name is 1 to 64 bytes of UTF-8 without control characters");
    }
    if (!IsFolderPath(mount.path)) {
        throw InvalidRecord("a mount's path begins with /, holds no . or .. and has at most 1024 bytes");
    }
    if (mount.max_bytes < 0 || mount.max_age_s < 0) {
        throw InvalidRecord("a mount's limits are not below 0");
    }
    for (const Mount& other : all) {
        if (other.id == mount.id) {
            continue;
        }
        if (other.name == mount.name) {
            throw AlreadyExists("there is already a mount \"" + mount.name + "\"");
        }
        if (IsInside(mount.path, other.path) || IsInside(other.path, mount.path)) {
            throw AlreadyExists("the mount \"" + other.name + "\" at " + other.path + " and " + mount.path +
                                " would lie inside each other");
        }
    }
}

void Write(soci::session& sql, const Mount& mount) {
    if (mount.is_default) {
        sql << "update mounts set is_default = 0";
    }
    const Number max_bytes = mount.max_bytes;
    const Number max_age = mount.max_age_s;
    const int enabled = mount.enabled;
    const int is_default = mount.is_default;
    sql << "insert into mounts (id, name, path, max_bytes, max_age, enabled, is_default)"
           " values (:id, :name, :path, :bytes, :age, :enabled, :default)"
           " on conflict (id) do update set name = excluded.name, path = excluded.path,"
           " max_bytes = excluded.max_bytes, max_age = excluded.max_age, enabled = excluded.enabled,"
           " is_default = excluded.is_default",
        soci::use(mount.id, "id"), soci::use(mount.name, "name"), soci::use(mount.path, "path"),
        soci::use(max_bytes, "bytes"), soci::use(max_age, "age"), soci::use(enabled, "enabled"),
        soci::use(is_default, "default");
}

int CountRows(soci::session& sql, const char* query, int id) {
    int count = 0;
    sql << query, soci::use(id, "id"), soci::into(count);
    return count;
}

void RequireFree(soci::session& sql, const Mount& mount) {
    if (CountRows(sql, "select count(*) from recording_plans where mount_id = :id", mount.id) > 0) {
        throw InvalidRecord("cameras record to the mount \"" + mount.name + "\": give them another one first");
    }
    if (mount.is_default && FetchAll(sql).size() > 1) {
        throw InvalidRecord("the mount \"" + mount.name + "\" is the default: make another one the default first");
    }
}

// In steps that do not hold up other writers for long.
void ForgetRows(Connection& connection, int id) {
    for (const char* statement :
         {"delete from events where id in (select id from events where mount_id = :id limit :limit)",
          "delete from marks where id in (select id from marks where mount_id = :id limit :limit)"}) {
        while (connection.Write([&](soci::session& sql) {
            soci::statement removal = (sql.prepare << statement, soci::use(id, "id"), soci::use(kRowsAtOnce, "limit"));
            removal.execute(true);
            return removal.get_affected_rows() > 0;
        })) {
        }
    }
}

}  // namespace

int Mounts::Add(const Mount& mount) {
    return connection_.Write([&](soci::session& sql) {
        Mount added = mount;
        added.id = NextId(sql, "mount");
        RaiseRevision(sql);
        const std::vector<Mount> others = FetchAll(sql);
        added.is_default = added.is_default || others.empty();
        RequireMount(added, others);
        lookhaven::store::Write(sql, added);
        return added.id;
    });
}

void Mounts::Update(const Mount& mount) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Mount changed = mount;
        changed.is_default = changed.is_default || Require(sql, mount.id).is_default;
        RequireMount(changed, FetchAll(sql));
        lookhaven::store::Write(sql, changed);
    });
}

void Mounts::Remove(int id, bool forget_events) {
    const Mount mount = connection_.Write([&](soci::session& sql) {
        Mount found = Require(sql, id);
        RequireFree(sql, found);
        return found;
    });
    if (forget_events) {
        ForgetRows(connection_, id);
    }
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireFree(sql, Require(sql, id));
        const int held = CountRows(sql, "select count(*) from events where mount_id = :id", id) +
                         CountRows(sql, "select count(*) from marks where mount_id = :id", id);
        if (held > 0) {
            throw InvalidRecord("the mount \"" + mount.name + "\" holds " + std::to_string(held) + " recordings");
        }
        sql << "delete from mounts where id = :id", soci::use(id, "id");
    });
}

std::optional<Mount> Mounts::Find(int id) {
    std::vector<Mount> found = connection_.Read([&](soci::session& sql) { return Fetch(sql, id, id); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::optional<Mount> Mounts::FindForPlan(int id) {
    if (id != 0) {
        return Find(id);
    }
    for (Mount& mount : List()) {
        if (mount.is_default) {
            return std::move(mount);
        }
    }
    return std::nullopt;
}

std::vector<Mount> Mounts::List() {
    return connection_.Read(FetchAll);
}

}  // namespace lookhaven::store
