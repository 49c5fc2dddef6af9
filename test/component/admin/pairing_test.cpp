// SPDX-License-Identifier: Apache-2.0
//
// Hosts are paired by a code: what was typed wrongly, for how long a code is valid and how often, who may ask for one,
// and what the audit log tells of pairings.
#include <atomic>
#include <functional>

#include "standalone/admin/change.h"
#include "standalone/admin/invitation.h"
#include "standalone/admin/servers.h"
#include "standalone/admin/users.h"
#include "standalone/remote/certificate.h"
#include "standalone/remote/pairing_code.h"
#include "standalone/store/audit_log.h"
#include "standalone/store/settings.h"
#include "standalone/store/transaction.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using remote::ParsePairingCode;
using store::Engine;
using store::EngineName;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

constexpr const char* kCertificate = "-----BEGIN CERTIFICATE-----\nMTIz\nNDU2\n-----END CERTIFICATE-----\n";
const remote::CertificateFacts kFacts{"CN=nvr", "8D:96:9E:EF:6E:CA:D3:C2:9A:3A:62:92", 0, true};
constexpr std::int64_t kMinute = 60;

// So many seconds after the test's present.
base::BootTime At(std::int64_t later_s) {
    return {"this boot", 5000 + later_s};
}

class Pairing : public store::StoreTest {
  protected:
    std::string NewSecret(const std::string& name = "Watcher", const base::BootTime& now = At(0)) {
        return ParsePairingCode(Invite(store_, manager_, name, kFacts, now)).secret;
    }
    // "paired", "invalid" or "name".
    static std::string Try(store::Store& store, const std::string& secret, const base::BootTime& now = At(0),
                           const std::string& attempt = "") {
        try {
            const std::string shared = AcceptInvitation(store, secret, attempt, "192.0.2.9", now);
            return store::RecordingServers(store).InboundPeerSecrets().back() == shared ? "paired" : "";
        } catch (const InvalidInvitation&) {
            return "invalid";
        } catch (const store::AlreadyExists&) {
            return "name";
        }
    }
    std::vector<std::string> Entries() {
        std::vector<std::string> texts;
        for (const store::AuditEntry& entry : store::AuditLog(store_).List(0, 9)) {
            texts.push_back(entry.who + "@" + entry.address + " " + entry.action + " " + entry.object + " " +
                            entry.before + entry.after);
        }
        return texts;
    }
    int AddOwner(const std::vector<store::RemoteCamera>& cameras) {
        return AddServer(store_, manager_,
                         {.name = "Owner", .address = "192.0.2.1", .port = 8443, .certificate = kCertificate},
                         std::string(64, 'a'), cameras, {.shows_cameras = true})
            .id;
    }

    store::Users users_{store_};
    store::RecordingServers servers_{store_};
    Actor manager_{users_.Add("ada", "correct horse", store::Privilege::kManager).id, "ada", "192.0.2.7"};
    Actor viewer_{users_.Add("eve", "correct horse", store::Privilege::kViewer).id, "eve", "192.0.2.8"};
};

TEST_P(Pairing, IsMadeOnceByAValidCodeAlone) {
    EXPECT_EQ(Try(store_, ""), "invalid") << "none was given out";
    EXPECT_THROW(RequireInvitation(store_, At(0)), InvalidInvitation);
    const std::string replaced = NewSecret();
    const std::string secret = NewSecret();
    const struct {
        const char* attempt;
        std::string secret;
        base::BootTime now;
        const char* outcome;
    } rows[] = {
        {"the one before", replaced, At(0), "invalid"},
        {"after its time", secret, At(10 * kMinute), "invalid"},
        {"after a restart of the machine", secret, {"another boot", 5000}, "invalid"},
        {"a part of it", secret.substr(1), At(0), "invalid"},
        {"what the store has", store::Settings(store_).Find("pairing_invitation").value(), At(0), "invalid"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(Try(store_, row.secret, row.now), row.outcome) << row.attempt;
    }
    for (const std::string& bytes : store::kHostileTexts) {
        EXPECT_EQ(Try(store_, bytes), "invalid");
    }
    EXPECT_TRUE(servers_.List().empty());
    EXPECT_THAT(store::Settings(store_).Find("pairing_invitation").value(), Not(HasSubstr(secret)));
    EXPECT_NO_THROW(RequireInvitation(store_, At(10 * kMinute - 1)));
    EXPECT_THROW(RequireInvitation(store_, At(10 * kMinute)), InvalidInvitation);
    EXPECT_EQ(Try(store_, secret, At(10 * kMinute - 1)), "paired");
    EXPECT_EQ(Try(store_, secret), "invalid") << "once more";
    EXPECT_THROW(RequireInvitation(store_, At(0)), InvalidInvitation) << "nothing is left to be guessed";
    const std::string record = R"({"address":"","enabled":true,"id":1,"name":"Watcher","port":0)";
    EXPECT_EQ(Try(store_, NewSecret()), "paired") << "renewed";
    EXPECT_THAT(Entries(),
                ElementsAre("ada@192.0.2.9 server.admit Watcher (1) " + record + "}" + record + R"(,"secret":"new"})",
                            R"(ada@192.0.2.7 server.invite Watcher {"minutes":10})",
                            "ada@192.0.2.9 server.admit Watcher (1) " + record + R"(,"secret":"new"})",
                            R"(ada@192.0.2.7 server.invite Watcher {"minutes":10})",
                            R"(ada@192.0.2.7 server.invite Watcher {"minutes":10})"));
}

TEST_P(Pairing, IsFoundAgainByWhoeverMadeIt) {
    const std::string secret = NewSecret();
    const std::string attempt(64, 'a');
    const std::string shared = AcceptInvitation(store_, secret, attempt, "192.0.2.9", At(0));
    const std::size_t entries = Entries().size();
    EXPECT_EQ(AcceptInvitation(store_, secret, attempt, "192.0.2.9", At(9)), shared) << "the answer was lost";
    EXPECT_EQ(Entries().size(), entries) << "nothing was changed";
    EXPECT_EQ(Try(store_, secret), "invalid");
    EXPECT_EQ(Try(store_, secret, At(0), std::string(64, 'b')), "invalid") << "somebody who has read the code";
    EXPECT_EQ(Try(store_, secret, At(10 * kMinute), attempt), "invalid");
    AdmitServer(store_, manager_, "Watcher");
    EXPECT_EQ(Try(store_, secret, At(0), attempt), "invalid") << "the new secret is not for whoever had the old one";
}

TEST_P(Pairing, EndsWithTheRightOfWhoeverAskedForTheCode) {
    EXPECT_THROW(Invite(store_, viewer_, "Watcher", kFacts, At(0)), Forbidden);
    EXPECT_THROW(Invite(store_, manager_, "", kFacts, At(0)), store::InvalidRecord);
    const std::string secret = NewSecret();
    users_.SetPrivilege(manager_.user_id, store::Privilege::kViewer);
    EXPECT_EQ(Try(store_, secret), "invalid") << "no manager any more";
    users_.SetPrivilege(manager_.user_id, store::Privilege::kManager);
    AddServer(store_, {}, {.name = "Watcher", .address = "192.0.2.1", .port = 1, .certificate = kCertificate},
              std::string(64, 'a'), {}, {});
    EXPECT_EQ(Try(store_, secret), "name") << "would replace a host that this one asks for cameras";
    EXPECT_THROW(NewSecret(), store::AlreadyExists);
    RemoveServer(store_, {}, 1, {}, false);
    EXPECT_EQ(Try(store_, secret), "paired") << "no attempt has used it up";
    const std::function<void()> taken_back[] = {
        [&] { SetUser(store_, {}, manager_.user_id, {}, {.password = store::HashedPassword("battery staple")}); },
        [&] { EndSessions(store_, {}, manager_.user_id, {}, ""); },
        [&] {
            ChangePassword(store_, "", *users_.CheckPassword("ada", "battery staple"),
                           store::HashedPassword("correct horse"), "");
        }};
    for (const auto& take_back : taken_back) {
        const std::string shown = NewSecret();
        EndSessions(store_, {}, viewer_.user_id, {}, "");  // another's
        EXPECT_NO_THROW(RequireInvitation(store_, At(0)));
        take_back();
        EXPECT_EQ(Try(store_, shown), "invalid") << "of an account whose access was taken back";
    }
}

TEST_P(Pairing, AGuessWaitsForNobodysChange) {
    NewSecret();
    store::InTransaction(store_, [&] {
        users_.Lock();
        store::Store other = store::Store::Open(url_);
        EXPECT_EQ(Try(other, std::string(16, '0')), "invalid");
    });
}

TEST_P(Pairing, IsOneHoweverManyTakeTheCodeAtOnce) {
    for (int round = 0; round < 5; ++round) {
        const std::string secret = NewSecret("Watcher " + std::to_string(round));
        std::atomic<int> made = 0;
        InParallel(4, [&](store::Store& store) { made += Try(store, secret) == "paired" ? 1 : 0; });
        EXPECT_EQ(made, 1);
    }
}

TEST_P(Pairing, IsChangedByManagersAloneAndTellsWhatGoesWithIt) {
    const std::vector<store::RemoteCamera> cameras{{.id_on_server = 4, .name = "Yard"}};
    EXPECT_THROW(AdmitServer(store_, viewer_, "Watcher"), Forbidden);
    EXPECT_THROW(AddServer(store_, viewer_, {}, std::string(64, 'a'), cameras, {}), Forbidden);
    const int id = AddOwner(cameras);
    EXPECT_EQ(store::Settings(store_).Find("cms"), "on");
    EXPECT_THROW(PutServerCameras(store_, viewer_, id, {}), Forbidden);
    EXPECT_EQ(PutServerCameras(store_, manager_, id, cameras), 0) << "all are known";
    EXPECT_EQ(PutServerCameras(store_, manager_, id, {{.id_on_server = 5, .name = "Dock"}}), 1);
    EXPECT_EQ(PutServerCameras(store_, manager_, id, {{.id_on_server = 5, .name = "Ramp"}}), 0);
    EXPECT_EQ(servers_.FindCamera(id, 5)->name, "Ramp") << "renamed, without a row: else it could fill the log";
    EXPECT_THROW(SetServer(store_, viewer_, id, {.port = 1}), Forbidden);
    EXPECT_THROW(RemoveServer(store_, viewer_, id, {}, true), Forbidden);
    EXPECT_THROW(SetServer(store_, manager_, id, {.address = "no/host"}), store::InvalidRecord);
    const std::int64_t seen = ServerRecord(servers_.Find(id).value())["revision"].asInt64();
    EXPECT_EQ(SetServer(store_, manager_, id, {.port = 443}).address, "192.0.2.1");
    EXPECT_THROW(RemoveServer(store_, manager_, id, seen, true), Stale);
    const int camera = servers_.FindCamera(id, 4).value().id;
    store::Denials denials;
    denials.cameras[store::CameraAccess::kLive].insert(camera);
    users_.SetDenials(viewer_.user_id, denials);
    try {
        RemoveServer(store_, manager_, id, {}, false);
        ADD_FAILURE() << "removed";
    } catch (const RemovesDenials& refusal) {
        EXPECT_EQ(refusal.Loss().denials.front().user, "eve");
        EXPECT_EQ(refusal.Loss().cameras.front().name, "Yard");
    }
    EXPECT_TRUE(servers_.Find(id));
    store::RecordingServer other = servers_.Find(id).value();
    EXPECT_NO_THROW(RequireSameServer(store_, other)) << "renewed";
    other.certificate += kCertificate;
    EXPECT_THROW(RequireSameServer(store_, other), MovesDenials);
    other.name = "Annex";
    EXPECT_NO_THROW(RequireSameServer(store_, other)) << "beside it";
    EXPECT_EQ(RemoveServer(store_, manager_, id, {}, true).denials.size(), 1U);
    EXPECT_THROW(RemoveServer(store_, manager_, id, {}, true), store::NotFound);
    const std::string record = R"({"address":"192.0.2.1",)";
    const std::string rest = R"("enabled":true,"id":1,"name":"Owner","port":)";
    const std::string who = "ada@192.0.2.7 server.";
    EXPECT_THAT(Entries(),
                ElementsAre(who + "remove Owner (1) " + record + R"("cameras":2,"denied":["eve: camera )" +
                                std::to_string(camera) + R"("],)" + rest + "443}",
                            who + "set Owner (1) " + record + rest + "8443}" + record + rest + "443}",
                            who + R"(cameras Owner (1) {"added":1})",
                            R"(ada@192.0.2.7 setting.set cms {"value":false}{"value":true})",
                            who + "add Owner (1) " + record + R"("cameras":1,)" + rest + R"(8443,"secret":"new"})"));
}

LOOKHAVEN_ON_BOTH_ENGINES(Pairing);

}  // namespace
}  // namespace lookhaven::admin
