// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/invitation.h"

#include "standalone/admin/change.h"
#include "standalone/admin/servers.h"
#include "standalone/base/json_text.h"
#include "standalone/remote/pairing_code.h"
#include "standalone/store/secret.h"
#include "standalone/store/settings.h"
#include "standalone/store/transaction.h"
#include "standalone/store/users.h"

namespace lookhaven::admin {

namespace {

// Its value is the invitation as JSON; empty once it was accepted and nobody may ask again.
constexpr const char* kInvitationSetting = "pairing_invitation";

[[noreturn]] void Refuse() {
    throw InvalidInvitation("wrong or expired pairing code");
}

// The one that is valid. Throws InvalidInvitation.
Json::Value FindInvitation(store::Store& store, const base::BootTime& now) {
    Json::Value invitation = base::ParseOneLineJson(store::Settings(store).Find(kInvitationSetting).value_or(""));
    if (!invitation.isObject() || invitation["boot"] != now.boot ||
        now.seconds - invitation["given"].asInt64() >= kInvitationLifetimeS) {
        Refuse();
    }
    return invitation;
}

// The same, where the secret belongs to it, and nobody has accepted it but by this attempt.
Json::Value FindInvitation(store::Store& store, std::string_view secret, std::string_view attempt,
                           const base::BootTime& now) {
    Json::Value invitation = FindInvitation(store, now);
    const bool is_free = !invitation.isMember("attempt");
    if (invitation["digest"] != store::Digest(secret) ||
        (!is_free && invitation["attempt"] != store::Digest(attempt))) {
        Refuse();
    }
    return invitation;
}

// The account that asked for the code makes the pairing, from the address where it was typed.
Actor ActorOf(store::Store& store, const Json::Value& invitation, const std::string& address) {
    Actor actor;
    actor.user_id = invitation["user"].asInt();
    actor.address = address;
    if (actor.user_id != 0) {
        const auto user = store::Users(store).Find(actor.user_id);
        actor.name = user ? user->name : "";
    }
    return actor;
}

// Makes the pairing, and notes in the invitation who may ask again, and for what.
std::string MakePairing(store::Store& store, const Actor& actor, Json::Value invitation, std::string_view attempt) {
    const NewPairing made = AdmitServer(store, actor, invitation["name"].asString());
    invitation["attempt"] = store::Digest(attempt);
    invitation["server"] = made.server.id;
    invitation["shared"] = store::Digest(made.secret);
    store::Settings(store).Set(kInvitationSetting, attempt.empty() ? "" : base::OneLineJson(invitation));
    return made.secret;
}

// The secret of the pairing that was made, while it is the one between the two hosts.
std::string FindPairing(store::Store& store, const Actor& actor, const Json::Value& invitation) {
    RequireManager(store, actor);
    std::string shared = store::RecordingServers(store).FindSecret(invitation["server"].asInt());
    if (invitation["shared"] != store::Digest(shared)) {
        Refuse();
    }
    return shared;
}

}  // namespace

std::string Invite(store::Store& store, const Actor& actor, const std::string& name,
                   const remote::CertificateFacts& certificate, const base::BootTime& now) {
    const remote::PairingCode code{remote::FingerprintPrefix(certificate),
                                   store::RandomHex(remote::kPairingSecretBytes)};
    Apply(store, actor, [&] {
        store::RecordingServer watcher;
        watcher.name = name;
        store::RecordingServers(store).RequirePairable(watcher);
        Json::Value invitation;
        invitation["digest"] = store::Digest(code.secret);
        invitation["boot"] = now.boot;
        invitation["given"] = Json::Int64{now.seconds};
        invitation["user"] = actor.user_id;
        invitation["name"] = name;
        store::Settings(store).Set(kInvitationSetting, base::OneLineJson(invitation));
        Json::Value after;
        after["minutes"] = Json::Int64{kInvitationLifetimeS / 60};
        return Change{"server.invite", name, {}, after};
    });
    return remote::ToText(code);
}

void VoidInvitationOf(store::Store& store, int user_id) {
    store::Settings settings(store);
    const Json::Value invitation = base::ParseOneLineJson(settings.Find(kInvitationSetting).value_or(""));
    if (invitation.isObject() && invitation["user"] == user_id) {
        settings.Set(kInvitationSetting, "");
    }
}

void RequireInvitation(store::Store& store, const base::BootTime& now) {
    FindInvitation(store, now);
}

std::string AcceptInvitation(store::Store& store, std::string_view secret, std::string_view attempt,
                             const std::string& address, const base::BootTime& now) {
    FindInvitation(store, secret, attempt, now);  // guessing locks nothing
    std::string shared;
    try {
        store::InTransaction(store, [&] {
            store::Users(store).Lock();
            const Json::Value invitation = FindInvitation(store, secret, attempt, now);
            const Actor actor = ActorOf(store, invitation, address);
            shared = invitation.isMember("attempt") ? FindPairing(store, actor, invitation)
                                                    : MakePairing(store, actor, invitation, attempt);
        });
    } catch (const Forbidden&) {
        throw InvalidInvitation("the pairing code belongs to an account that is no longer a manager");
    }
    return shared;
}

}  // namespace lookhaven::admin
