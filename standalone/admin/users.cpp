// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/users.h"

#include <algorithm>

#include "standalone/admin/change.h"
#include "standalone/admin/invitation.h"
#include "standalone/admin/user_record.h"
#include "standalone/base/clock.h"
#include "standalone/store/cameras.h"
#include "standalone/store/servers.h"

namespace lookhaven::admin {

namespace {

using store::CameraAccess;
using store::Privilege;
using store::User;
using store::Users;

User RequireUser(Users& users, int id) {
    std::optional<User> user = users.Find(id);
    if (!user) {
        throw store::NotFound("there is no account " + std::to_string(id));
    }
    return *std::move(user);
}

// privilege: of the account before the change, or after it.
void RequireMayManage(Users& users, const Actor& actor, Privilege privilege) {
    if (actor.user_id != 0 && privilege == Privilege::kOwner &&
        RequireUser(users, actor.user_id).privilege != Privilege::kOwner) {
        throw Forbidden("only an owner may add, change or remove an owner");
    }
}

void RequireAnotherOwner(Users& users, const User& user) {
    const std::vector<User> all = users.List();
    if (user.privilege == Privilege::kOwner && std::ranges::count(all, Privilege::kOwner, &User::privilege) == 1) {
        throw StillNeeded(user.name + " is the only owner: add another one first");
    }
}

// Each newly denied camera must exist: a typing error would deny nothing, and nobody would notice. A removed camera
// may stay denied, since its recordings stay.
void RequireCameras(store::Store& store, const store::Denials& before, const store::Denials& after) {
    for (const auto& [kind, ids] : after.cameras) {
        const auto known = before.cameras.find(kind);
        for (const int id : ids) {
            if ((known == before.cameras.end() || !known->second.contains(id)) && !store::Cameras(store).Find(id) &&
                !store::RecordingServers(store).FindCamera(id)) {
                throw store::NotFound("there is no camera " + std::to_string(id));
            }
        }
    }
}

// Items need not exist, so nothing else bounds their number. What is denied already may stay.
void RequireFewItems(const store::Denials& before, const store::Denials& after) {
    constexpr std::size_t kMaxItems = 1'000;
    for (const auto& [kind, ids] : after.items) {
        const auto known = before.items.find(kind);
        if (ids.size() > kMaxItems && (known == before.items.end() || !std::ranges::includes(known->second, ids))) {
            throw store::InvalidRecord("an account is denied at most 1,000 items of a kind");
        }
    }
}

void SetMayMark(Users& users, const User& user, bool may_mark, bool is_new_privilege) {
    if (user.IsManager()) {
        // Making an account a manager implies the right.
        if (!may_mark && !is_new_privilege) {
            throw store::InvalidRecord(user.name + " is " +
                                       (user.privilege == Privilege::kOwner ? "owner" : "manager") +
                                       ", and may report alerts and POS transactions as such");
        }
        return;
    }
    if (may_mark != user.may_mark_as_viewer) {
        may_mark ? users.AllowMarks(user.id) : users.DenyMarks(user.id);
    }
}

// Inside of Apply. Returns the new record.
Json::Value Make(store::Store& store, const User& before, const UserChange& change) {
    Users users(store);
    if (change.password) {
        users.SetPassword(before.id, *change.password);
    }
    if (change.password || change.privilege || change.denials) {
        VoidInvitationOf(store, before.id);  // as they end the account's sessions
    }
    if (change.privilege && *change.privilege != before.privilege) {
        users.SetPrivilege(before.id, *change.privilege);
    }
    if (change.may_mark) {
        SetMayMark(users, RequireUser(users, before.id), *change.may_mark, change.privilege.has_value());
    }
    if (change.denials) {
        const store::Denials denied = users.FindDenials(before.id);
        store::Denials wanted = denied;
        change.denials(wanted);
        RequireCameras(store, denied, wanted);
        RequireFewItems(denied, wanted);
        users.SetDenials(before.id, wanted);
    }
    return UserRecord(store, RequireUser(users, before.id));
}

// The audit log says that there is a new password, not which.
Json::Value Audited(Json::Value record, const UserChange& change) {
    if (change.password) {
        record["password"] = "new";
    }
    return record;
}

}  // namespace

Json::Value AddUser(store::Store& store, const Actor& actor, const std::string& name, const UserChange& change) {
    Json::Value record;
    Apply(store, actor, [&] {
        Users users(store);
        const Privilege privilege = change.privilege.value_or(Privilege::kViewer);
        RequireMayManage(users, actor, privilege);
        const User user = users.Add(name, change.password.value(), privilege);
        record = Make(store, user, {{}, privilege, change.may_mark, change.denials});
        return Change{"user.add", Named(user.name, user.id), {}, record};
    });
    return record;
}

Json::Value SetUser(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen,
                    const UserChange& change) {
    Json::Value record;
    Apply(store, actor, [&] {
        Users users(store);
        const User user = RequireUser(users, id);
        RequireMayManage(users, actor, user.privilege);
        RequireMayManage(users, actor, change.privilege.value_or(user.privilege));
        const Json::Value before = UserRecord(store, user);
        RequireCurrent(before, seen);
        if (change.privilege.value_or(user.privilege) != user.privilege) {
            RequireAnotherOwner(users, user);
        }
        record = Make(store, user, change);
        return Change{"user.set", Named(user.name, id), before, Audited(record, change)};
    });
    return record;
}

void RemoveUser(store::Store& store, const Actor& actor, int id, std::optional<std::int64_t> seen) {
    Apply(store, actor, [&] {
        Users users(store);
        const User user = RequireUser(users, id);
        RequireMayManage(users, actor, user.privilege);
        const Json::Value before = UserRecord(store, user);
        RequireCurrent(before, seen);
        RequireAnotherOwner(users, user);
        if (id == actor.user_id) {
            throw StillNeeded("you cannot remove your own account; ask another manager");
        }
        users.Remove(id);
        return Change{"user.remove", Named(user.name, id), before, {}};
    });
}

std::vector<store::Session> SessionsOf(store::Store& store, const Actor& actor, int id) {
    if (id != actor.user_id) {
        RequireManager(store, actor);
    }
    Users users(store);
    RequireUser(users, id);
    return store::Sessions(store).OfUser(id, base::WallSeconds());
}

int EndSessions(store::Store& store, const Actor& actor, int id, const std::optional<std::string>& handle,
                std::string_view kept) {
    int ended = 0;
    const auto apply = id == actor.user_id ? ApplyToSelf : Apply;
    apply(store, actor, [&] {
        Users users(store);
        const User user = RequireUser(users, id);
        RequireMayManage(users, actor, user.privilege);
        store::Sessions sessions(store);
        ended = handle ? sessions.End(id, *handle) : sessions.EndOfUser(id, kept);
        VoidInvitationOf(store, id);
        Json::Value after;
        after["ended"] = ended;
        return Change{"user.endSessions", Named(user.name, id), {}, ended > 0 ? after : Json::Value()};
    });
    return ended;
}

void ChangePassword(store::Store& store, const std::string& address, const store::VerifiedUser& user,
                    const store::HashedPassword& password, std::string_view kept_session) {
    ApplyToSelf(store, {user.id, user.name, address}, [&] {
        Users(store).SetPassword(user, password, kept_session);
        VoidInvitationOf(store, user.id);
        Json::Value after;
        after["password"] = "new";
        return Change{"user.changePassword", Named(user.name, user.id), {}, after};
    });
}

std::vector<VisibleCamera> CamerasAsSeenBy(store::Store& store, int user_id) {
    Users users(store);
    RequireUser(users, user_id);
    const std::set<int> not_live = users.DeniedCameras(user_id, CameraAccess::kLive);
    const std::set<int> not_heard = users.DeniedCameras(user_id, CameraAccess::kAudio);
    const std::set<int> not_played = users.DeniedCameras(user_id, CameraAccess::kPlayback);
    const std::set<int> not_exported = users.DeniedCameras(user_id, CameraAccess::kExport);
    std::vector<VisibleCamera> cameras;
    const auto add = [&](const auto& camera) {
        const bool live = !not_live.contains(camera.id);
        const bool played = !not_played.contains(camera.id);
        const bool heard = camera.audio && (live || played) && !not_heard.contains(camera.id);
        cameras.push_back({camera.id, camera.name, live, heard, played, !not_exported.contains(camera.id)});
    };
    std::ranges::for_each(store::Cameras(store).List(), add);
    std::ranges::for_each(store::RecordingServers(store).ListCameras(), add);
    std::ranges::sort(cameras, {}, &VisibleCamera::id);
    return cameras;
}

}  // namespace lookhaven::admin
