// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/mounts.h"

#include <filesystem>

#include "standalone/admin/change.h"
#include "standalone/admin/mount_claim.h"
#include "standalone/base/clock.h"

namespace lookhaven::admin {

namespace {

store::Mount RequireMount(store::Store& store, int id) {
    std::optional<store::Mount> mount = store::Mounts(store).Find(id);
    if (!mount) {
        throw store::NotFound("there is no mount " + std::to_string(id));
    }
    return *std::move(mount);
}

}  // namespace

void MountChange::ApplyTo(store::Mount& mount) const {
    mount.name = name.value_or(mount.name);
    mount.enabled = enabled.value_or(mount.enabled);
    mount.is_default = mount.is_default || is_default;
    mount.max_bytes = max_bytes.value_or(mount.max_bytes);
    mount.max_age_s = max_age_s.value_or(mount.max_age_s);
    if (path) {
        mount.path = RequireFolder(*path);
    }
}

Json::Value MountRecord(const store::Mount& mount) {
    Json::Value json;
    json["id"] = mount.id;
    json["name"] = mount.name;
    json["path"] = mount.path;
    json["enabled"] = mount.enabled;
    json["default"] = mount.is_default;
    json["shared"] = mount.IsShared();
    json["limit"]["bytes"] = mount.max_bytes > 0 ? Json::Value(Json::Int64{mount.max_bytes}) : Json::Value();
    json["limit"]["days"] = DaysJson(mount.max_age_s);
    json["revision"] = Json::Int64{RevisionOf(json)};
    return json;
}

store::Mount AddMount(store::Store& store, const Actor& actor, const MountChange& change) {
    store::Mount mount;
    if (change.is_shared && change.own_host == 0) {
        throw store::InvalidRecord(
            "a shared mount needs hosts that share a store in PostgreSQL: see lookhaven host add");
    }
    mount.host_id = change.is_shared ? store::kAllHosts : change.own_host;
    change.ApplyTo(mount);
    RequireFreeFolder(store, mount.path, 0, change.take_over);
    if (mount.name.empty()) {
        mount.name = std::filesystem::path(mount.path).filename();
    }
    Apply(store, actor, [&] {
        mount = RequireMount(store, store::Mounts(store).Add(mount));
        MarkFolder(store, mount);
        return Change{"mount.add", Named(mount.name, mount.id), {}, MountRecord(mount)};
    });
    ReserveIds(store, mount);
    return mount;
}

store::Mount SetMount(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                      const MountChange& change) {
    const store::Mount known = RequireMount(store, id);
    store::Mount mount = known;
    change.ApplyTo(mount);
    const bool is_marked = change.path || change.take_over;
    if (is_marked && !known.IsOf(change.own_host)) {
        throw store::InvalidRecord("the mount \"" + known.name + "\" is another host's: change its folder there");
    }
    if (is_marked) {
        RequireFreeFolder(store, RequireFolder(mount.path), id, change.take_over);
        RequireSharedFolder(store, mount, change.own_host);
    }
    RequireCurrent(MountRecord(known), seen);
    if (!change.confirmed && (IsLower(mount.max_bytes, known.max_bytes) || IsLower(mount.max_age_s, known.max_age_s))) {
        RequireNoLoss(known, mount, [&store, now_s = base::WallSeconds()](const store::Mount& limits) {
            return maintenance::ForecastRetention(store, limits, now_s);
        });
    }
    Apply(store, actor, [&] {
        const store::Mount before = RequireMount(store, id);
        RequireCurrent(MountRecord(before), seen);
        mount = before;
        change.ApplyTo(mount);
        store::Mounts(store).Update(mount);
        mount = RequireMount(store, id);
        if (is_marked) {
            MarkFolder(store, mount);
        }
        return Change{"mount.set", Named(mount.name, id), MountRecord(before), MountRecord(mount)};
    });
    if (is_marked) {
        ReserveIds(store, mount);
    }
    return mount;
}

void RemoveMount(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                 bool forget_events) {
    store::Mounts mounts(store);
    try {
        if (forget_events) {
            RequireManager(store, actor);
            RequireCurrent(MountRecord(RequireMount(store, id)), seen);
            mounts.ForgetEvents(id);
        }
        Apply(store, actor, [&] {
            const store::Mount mount = RequireMount(store, id);
            RequireCurrent(MountRecord(mount), seen);
            mounts.Remove(id, false);
            return Change{"mount.remove", Named(mount.name, id), MountRecord(mount), {}};
        });
    } catch (const store::InvalidRecord& error) {
        throw StillNeeded(error.what());
    }
}

}  // namespace lookhaven::admin
