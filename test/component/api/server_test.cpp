// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Server and VEXO.Pairing: a code is shown to managers with their password, and a client that guesses at it is
// slowed down and keeps nobody out.
#include <cstdlib>
#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/base/file.h"
#include "standalone/remote/pairing_code.h"
#include "standalone/store/servers.h"
#include "test/support/host/host_under_test.h"

namespace lookhaven::api {

using host::Answer;
using host::HostUnderTest;
using testing::HasSubstr;
using testing::Not;

namespace {

class ServerApi : public testing::Test {
  protected:
    ServerApi() {
        const std::string tls = host_.Home().TlsFolder();
        const std::string command =
            "mkdir -p " + tls +
            " && openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes -days 90" +
            " -subj /CN=nvr -keyout " + tls + "/key.pem -out " + tls + "/certificate.pem 2>/dev/null";
        EXPECT_EQ(std::system(command.c_str()), 0);
    }

    Answer Ask(const std::string& method, const std::string& body) const {
        return host_.Ask("api=VEXO.Server&version=1&method=" + method, admin_, {}, body);
    }
    Answer Invite() const { return Ask("Invite", "name=Watcher&reauth=right+password"); }
    std::string NewSecret() const {
        return remote::ParsePairingCode(Invite().Json()["data"]["code"].asString()).secret;
    }
    Answer Accept(const std::string& secret, const std::string& address, const std::string& query = "") const {
        return host_.Ask("api=VEXO.Pairing&version=1&method=Accept" + query, "", {{"REMOTE_ADDR", address}},
                         "code=" + secret);
    }
    std::string Log(const char* name) const { return base::ReadFile(host_.Home().LogFolder() / name); }

    HostUnderTest host_;
    std::string admin_ = host_.LogIn().secret;
    store::Store store_ = store::Store::Open(host_.Home().StoreUrl());
};

TEST_F(ServerApi, ShowsACodeToWhoeverGivesThePasswordAgain) {
    EXPECT_EQ(Ask("Invite", "name=Watcher").status, 403);
    EXPECT_EQ(Ask("Invite", "name=Watcher&reauth=wrong").status, 403);
    EXPECT_EQ(Ask("Invite", "name=&reauth=right+password").status, 400);
    EXPECT_EQ(Ask("Invite&reauth=right+password", "name=Watcher").status, 400);
    EXPECT_EQ(Invite().Json()["data"]["seconds"], 600);
    std::filesystem::resize_file(host_.Home().TlsFolder() / "certificate.pem", 9);
    EXPECT_EQ(Invite().status, 409) << "what would it bind?";
    std::filesystem::remove(host_.Home().TlsFolder() / "certificate.pem");
    EXPECT_EQ(Invite().status, 409);
}

TEST_F(ServerApi, ACodeIsTakenOnceAndGuessingIsBounded) {
    for (int attempt = 0; attempt < 7; ++attempt) {
        EXPECT_EQ(Accept(std::string(16, '0'), "2001:db8::1").status, 403) << "nothing is there to be guessed";
    }
    const std::string secret = NewSecret();
    EXPECT_EQ(Accept("", "192.0.2.1", "&code=" + secret).status, 400) << "logs keep addresses";
    for (int attempt = 0; attempt < 5; ++attempt) {
        EXPECT_EQ(Accept(std::string(16, '0'), "2001:db8::1").status, 403);
    }
    EXPECT_EQ(Accept(std::string(16, '0'), "2001:db8::2").status, 429);
    EXPECT_EQ(Accept(std::string(16, '0'), "192.0.2.1").status, 403) << "another network";
    EXPECT_TRUE(store::RecordingServers(store_).List().empty());
    const Answer accepted = Accept(secret, "2001:db8::3");  // who shares their network is not kept out
    ASSERT_EQ(accepted.status, 200) << accepted.body;
    EXPECT_EQ(accepted.Json()["data"]["secret"].asString(),
              store::RecordingServers(store_).InboundPeerSecrets().front());
    EXPECT_TRUE(accepted.Json()["data"]["camera"].isArray());
    EXPECT_EQ(Accept(secret, "192.0.2.1").status, 403);
    EXPECT_THAT(Log("refused-log-ins.log"),
                AllOf(HasSubstr("\"pairing code\" from \"2001:db8::1\": wrong or expired pairing code\n"),
                      HasSubstr("from \"2001:db8::2\": too many attempts with a pairing code; try again in ")));
    EXPECT_THAT(Log("refused-log-ins.log"), Not(HasSubstr(secret)));
    EXPECT_THAT(Ask("List", "x=1").body, Not(HasSubstr(accepted.Json()["data"]["secret"].asString())));
}

TEST_F(ServerApi, SaysWhatIsWrongWithACodeOrAnAddressAndNoMoreThanThat) {
    const std::string code = "008J-4CT4-ANK7-F24S-04HM-ASW9-NF6Y-Z93N";
    const std::string away = "name=x&reauth=right+password&address=127.0.0.1&port=1&code=";
    const std::string nowhere = "name=x&reauth=right+password&address=no-such-host.invalid&code=";
    const struct {
        std::string body;
        int status;
        const char* says;
    } rows[] = {
        {"name=x&address=127.0.0.1&port=1&code=" + code.substr(1), 400, "not complete"},
        {"name=x&address=127.0.0.1&port=1&code=1" + code.substr(1), 400, "typing error"},
        {"name=x&address=127.0.0.1&port=1&code=[1]", 400, "code must be a text"},
        {"name=x&address=127.0.0.1&port=1&reauth=wrong&code=" + code, 403, "password"},
        {"name=x&reauth=right+password&address=a/b&port=1&code=" + code, 400, "host name or address"},
        {"name=x&reauth=right+password&address=127.0.0.1&port=70000&code=" + code, 400, "port from 1"},
        {away + code, 502, R"({"reason":"unreachable"})"},
        {nowhere + code, 502, R"({"reason":"unreachable"})"},
    };
    for (const auto& row : rows) {
        const Answer answer = Ask("Add", row.body);
        EXPECT_EQ(answer.status, row.status) << row.body;
        EXPECT_THAT(answer.body, HasSubstr(row.says)) << row.body;
    }
    EXPECT_EQ(Ask("Add&code=" + code, "name=x&address=127.0.0.1&port=1").status, 400);
    EXPECT_EQ(Ask("Add", away + code).body, Ask("Add", nowhere + code).body) << "whatever the address is";
    EXPECT_TRUE(store::RecordingServers(store_).List().empty());
}

TEST_F(ServerApi, AHostIsCheckedAndRemovedAsItWasSeen) {
    store::RecordingServers servers(store_);
    EXPECT_EQ(Accept(NewSecret(), "192.0.2.1").status, 200);
    store::RecordingServer annex{.name = "Annex", .address = "127.0.0.1", .port = 1};
    annex.certificate = "-----BEGIN CERTIFICATE-----\n-----END CERTIFICATE-----\n";
    annex.id = servers.Pair(annex, std::string(64, 'a'), {{.id_on_server = 1, .name = "Yard"}});
    EXPECT_EQ(Ask("Check", "id=1").status, 400) << "it asks this host";
    EXPECT_EQ(Ask("Check", "id=9").status, 404);
    EXPECT_THAT(Ask("Check", "id=2").body, HasSubstr("no certificate"));
    annex.enabled = false;
    servers.Update(annex);
    EXPECT_THAT(Ask("Check", "id=2").body, HasSubstr("disabled"));
    const Json::Value listed = Ask("List", "x=1").Json()["data"]["server"];
    ASSERT_EQ(listed.size(), 2U);
    EXPECT_EQ(listed[1]["camera"][0]["name"], "Yard");
    const std::string seen = "id=2&revision=" + listed[1]["revision"].asString();
    EXPECT_EQ(Ask("Remove", "id=2").status, 400);
    store::Users users(store_);
    store::Denials denials;
    denials.cameras[store::CameraAccess::kLive].insert(listed[1]["camera"][0]["id"].asInt());
    users.SetDenials(2, denials);
    EXPECT_EQ(Ask("Remove", seen).Json()["data"]["confirm"]["denial"][0]["user"], "guest");
    annex.port = 2;
    servers.Update(annex);
    const Answer stale = Ask("Remove", seen + "&confirm=true");
    EXPECT_EQ(stale.status, 409);
    const Json::Value now = stale.Json()["error"]["data"];
    EXPECT_EQ(now["denial"][0]["kind"], "camera");
    EXPECT_EQ(Ask("Remove", "id=2&confirm=true&revision=" + now["revision"].asString())
                  .Json()["data"]["removed"]["camera"][0]["name"],
              "Yard");
    EXPECT_EQ(servers.List().size(), 1U);
}

}  // namespace
}  // namespace lookhaven::api
