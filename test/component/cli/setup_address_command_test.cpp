// SPDX-License-Identifier: Apache-2.0
//
// lookhaven setup-address: what it prints, whom it leaves it to, and that it stops once there is an account;
// and lookhaven certificate, whose fingerprint it prints.
#include <cstdlib>
#include <fstream>
#include <regex>

#include "standalone/admin/first_account.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/host_name.h"
#include "standalone/store/servers.h"
#include "standalone/store/users.h"
#include "test/component/cli/program.h"

namespace lookhaven::cli {
namespace {

using testing::HasSubstr;
using testing::Not;

class SetupAddress : public CliTest {
  protected:
    SetupAddress() { EXPECT_THAT(Run("init").text, HasSubstr("lookhaven setup-address")); }

    // "valid", "void", or "none" when the text has no token.
    std::string TokenIn(const std::string& text) {
        std::smatch found;
        if (!std::regex_search(text, found, std::regex("#setup=([0-9a-f]{48})"))) {
            return "none";
        }
        try {
            store::Store store = Open();
            admin::RequireSetupToken(store, found[1].str(), base::TimeSinceBoot());
            return "valid";
        } catch (const admin::InvalidToken&) {
            return "void";
        }
    }

    const std::filesystem::path file_ = home_ / "run/setup-address";
};

TEST_F(SetupAddress, IsThatOfTheWebServerAndTheNewestAloneIsValid) {
    const std::string bare = Run("setup-address").text;
    EXPECT_EQ(TokenIn(bare), "valid");
    EXPECT_THAT(bare, Not(HasSubstr("http"))) << "the address is not known";
    std::ofstream(home_ / "run/nginx.conf") << "    listen 127.0.0.1:8181 sndbuf=192k;\n"
                                               "    listen 8543 ssl http2 sndbuf=192k;\n"
                                               "    listen [::]:8543 ssl http2 ipv6only=on sndbuf=192k;\n";
    const std::string text = Run("setup-address --if-needed").text;
    EXPECT_EQ(TokenIn(bare), "void");
    EXPECT_EQ(TokenIn(text), "valid");
    EXPECT_THAT(text, HasSubstr("http://127.0.0.1:8181/#setup="));
    const std::string remote = "https://" + base::OwnHostName() + ":8543/#setup=";
    EXPECT_NE(text.find(remote), text.npos) << text;
    EXPECT_EQ(text.find(remote), text.rfind(remote)) << "once";
    EXPECT_EQ(base::ReadFile(file_), text);
    EXPECT_EQ(std::filesystem::status(file_).permissions(), std::filesystem::perms(0600));
    EXPECT_EQ(TokenIn(Run("setup-address --json").text), "valid");
    EXPECT_THAT(text, Not(HasSubstr("fingerprint"))) << "there is no certificate";
}

TEST_F(SetupAddress, TellsTheFingerprintOfTheCertificate) {
    const std::string tls = (home_ / "tls").string();
    const std::string certificate = tls + "/certificate.pem";
    ASSERT_EQ(std::system(("openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:prime256v1 -nodes -subj /CN=nvr "
                           "-keyout " +
                           tls + "/key.pem -out " + certificate +
                           " 2>/dev/null && openssl x509 -noout "
                           "-fingerprint -sha256 -in " +
                           certificate + " > " + tls + "/told")
                              .c_str()),
              0);
    const std::string told = base::ReadFile(tls + "/told");
    const std::string fingerprint = told.substr(told.find('=') + 1, 95);
    EXPECT_THAT(Run("setup-address").text, HasSubstr("\n    " + fingerprint + "\n"));
    EXPECT_THAT(Run("setup-address --json").text, HasSubstr("\"fingerprint\" : \"" + fingerprint + "\""));
    std::ofstream(certificate) << "nothing";
    EXPECT_EQ(TokenIn(Run("setup-address").text), "valid");
}

TEST_F(SetupAddress, CertificatesAreReplacedOnceTheirFilesAreChecked) {
    const std::string own = (home_ / "own").string();
    ASSERT_EQ(
        std::system(("openssl req -x509 -newkey rsa:2048 -nodes -subj /CN=nvr -keyout " + own + ".key -out " + own +
                     ".pem 2>/dev/null && openssl req -x509 -newkey rsa:2048 -nodes -subj /CN=nvr -keyout " + own +
                     "2.key -out " + own + "2.pem 2>/dev/null")
                        .c_str()),
        0);
    Play({{"certificate show", 66, "there is no certificate yet"},
          {"certificate set " + own + ".pem " + own + "2.key", 65, "that of another certificate"},
          {"certificate set " + own + ".pem /nowhere.key", 66, "/nowhere.key"},
          {"certificate set " + own + ".pem " + own + ".key", 0, "The web server does not run", "PRIVATE"},
          {"certificate show", 0, "CN=nvr"},
          {"certificate show --json", 0, "\"selfSigned\" : true", "PRIVATE"}});
    store::Store store = Open();
    store::RecordingServers(store).Add({.name = "Watcher"}, std::string(64, 'a'));
    const std::string other = "certificate set " + own + "2.pem " + own + "2.key";
    Play({{other, 65, "must be paired again: Watcher"}, {other + " --confirm", 0, "To be paired again: Watcher"}});
    EXPECT_THAT(Run("audit").text, HasSubstr("certificate.set"));
}

TEST_F(SetupAddress, IsRefusedOnceThereIsAnAccount) {
    EXPECT_EQ(TokenIn(Run("setup-address").text), "valid");
    EXPECT_EQ(Run("setup-address", "", true).code, 77) << "another user of this machine";
    EXPECT_THAT(Run("user add ada --privilege owner", "ada-s3cret\n").text, HasSubstr("Added"));
    Play({{"setup-address", 65, "there is an account already"}, {"setup-address --if-needed", 0, "", "#"}});
    EXPECT_FALSE(std::filesystem::exists(file_)) << "the token is not valid any more";
    EXPECT_THAT(Run("init").text, Not(HasSubstr("setup-address")));
}

}  // namespace
}  // namespace lookhaven::cli
