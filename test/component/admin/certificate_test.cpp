// SPDX-License-Identifier: Apache-2.0
//
// The web server's certificate: how it is replaced, and that the files belong together whatever happens.
#include "standalone/admin/certificate.h"

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "standalone/admin/certificate_folder.h"
#include "standalone/admin/change.h"
#include "standalone/admin/web_server.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/remote/certificate_pair.h"
#include "standalone/store/servers.h"
#include "standalone/store/users.h"
#include "test/component/remote/certificate_files.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using remote::File;
using store::Engine;
using store::EngineName;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

CertificateOffer Offer(const std::string& name) {
    return {File(name + ".pem"), File(name + ".key")};
}

class CertificateTest : public store::StoreTest {
  protected:
    std::filesystem::path Made() const {
        base::Installation::CreateFolders(folder_ / "home");
        return folder_ / "home";
    }
    // "ec": whose pair is on the disk, and fits.
    std::string OnDisk() const {
        const std::filesystem::path tls = installation_.TlsFolder();
        for (const char* name : {"ec", "rsa", "other"}) {
            if (base::ReadFile(tls / "certificate.pem") == File(std::string(name) + ".pem")) {
                remote::ReadCertificatePair(base::ReadFile(tls / "certificate.pem"), base::ReadFile(tls / "key.pem"),
                                            base::WallSeconds() + 60);
                return name;
            }
        }
        return "another";
    }
    Json::Value Replace(const std::string& name, const Actor& actor, const Reload& reload) {
        return ReplaceCertificate(store_, installation_, actor, Offer(name), reload);
    }

    const base::Installation installation_{Made()};
    const Actor manager_{store::Users(store_).Add("bob", "correct horse", store::Privilege::kManager).id, "bob",
                         "192.0.2.7"};
    const Actor viewer_{store::Users(store_).Add("eve", "correct horse", store::Privilege::kViewer).id, "eve", ""};
    const Reload is_away_ = [](const std::string&) { return false; };
};

TEST_P(CertificateTest, IsReplacedWithAllThatIsKnownOfIt) {
    const std::filesystem::path tls = installation_.TlsFolder();
    EXPECT_TRUE(CurrentCertificate(installation_).isNull());
    EXPECT_THROW(Replace("ec", viewer_, is_away_), Forbidden);
    EXPECT_THROW(ExamineCertificate(store_, installation_, viewer_, Offer("ec")), Forbidden);
    base::WriteFileAtomically(tls / "made-here", "sums");
    EXPECT_FALSE(Replace("ec", manager_, is_away_)["reloaded"].asBool());
    store::RecordingServers(store_).Add({.name = "Watcher"}, std::string(64, 'a'));
    store::RecordingServers(store_).Add(
        {.name = "Annex", .address = "192.0.2.1", .port = 1, .certificate = File("other.pem")}, std::string(64, 'b'));

    const Json::Value told = ExamineCertificate(store_, installation_, manager_, Offer("rsa"));
    EXPECT_EQ(told["pairedHosts"].size(), 1U) << told;
    EXPECT_EQ(told["pairedHosts"][0], "Watcher") << "Annex is asked by this host, and does not know its certificate";
    EXPECT_EQ(ExamineCertificate(store_, installation_, manager_, Offer("ec"))["pairedHosts"].size(), 0U);
    EXPECT_EQ(OnDisk(), "ec") << "nothing was changed";

    std::string asked_for;
    const Json::Value done = Replace("rsa", manager_, [&](const std::string& fingerprint) {
        asked_for = fingerprint;
        return OnDisk() == "rsa";
    });
    EXPECT_TRUE(done["reloaded"].asBool());
    EXPECT_EQ(asked_for, CurrentCertificate(installation_)["fingerprint"].asString());
    EXPECT_EQ(OnDisk(), "rsa");
    EXPECT_EQ(base::ReadFile(tls / "made-here"), "sums") << "what else lies there stays";
    EXPECT_FALSE(std::filesystem::exists(installation_.Home() / "tls.new"));
    for (const std::filesystem::path& file : {tls / "key.pem", tls / "certificate.pem"}) {
        EXPECT_EQ(std::filesystem::status(file).permissions(), std::filesystem::perms(0600));
    }
    const std::vector<std::string> entries = Audited();
    EXPECT_THAT(entries, ElementsAre(HasSubstr("certificate.set web server {"), HasSubstr("192.0.2.7")));
    const std::string key = File("rsa.key");
    EXPECT_THAT(entries[0] + base::ReadFile(tls / "certificate.pem"), Not(HasSubstr(key.substr(100, 64))));
    EXPECT_THAT(done.toStyledString(), Not(HasSubstr("PRIVATE")));
}

TEST_P(CertificateTest, ComesBackWhereTheWebServerRefusesTheNewOne) {
    Replace("ec", manager_, is_away_);
    const std::string before = CurrentCertificate(installation_)["fingerprint"].asString();
    std::vector<std::string> shown;
    const auto refuse_new = [&](const std::string& fingerprint) {
        shown.push_back(OnDisk());
        return fingerprint == before ? true : throw WebServerRefused("it says no");
    };
    try {
        Replace("other", manager_, refuse_new);
        ADD_FAILURE() << "taken";
    } catch (const WebServerRefused& error) {
        EXPECT_STREQ(error.what(), "it says no; the certificate from before is in use again");
    }
    EXPECT_THAT(shown, ElementsAre("other", "ec")) << "what the web server reads each time";
    EXPECT_EQ(OnDisk(), "ec");
    EXPECT_EQ(Audited().size(), 3U) << "there, and back";
    const auto fail = [](const std::string&) -> bool { throw std::runtime_error("out of order"); };
    EXPECT_THROW(Replace("other", manager_, fail), std::runtime_error);
    EXPECT_EQ(OnDisk(), "ec");
    EXPECT_FALSE(std::filesystem::exists(installation_.Home() / "tls.new"));
}

TEST_P(CertificateTest, FitsItsKeyWheneverAProcessDies) {
    Replace("ec", manager_, is_away_);
    const struct {
        bool is_exchanged;
        const char* left;
    } rows[] = {{false, "ec"}, {true, "other"}};
    for (const auto& row : rows) {
        const pid_t child = ::fork();
        if (child == 0) {
            CertificateFolder folder(installation_);
            folder.Prepare(File("other.pem"), File("other.key"));
            if (row.is_exchanged) {
                folder.Exchange();
            }
            ::_exit(0);  // without its destructor, as when it is killed
        }
        int status = -1;
        ::waitpid(child, &status, 0);
        EXPECT_EQ(status, 0);
        EXPECT_TRUE(std::filesystem::exists(installation_.Home() / "tls.new"));
        EXPECT_EQ(OnDisk(), row.left);
    }
    {
        const CertificateFolder held(installation_);  // deletes nothing that it has not made
        EXPECT_THROW(Replace("rsa", manager_, is_away_), StillNeeded) << "nobody waits for the web server of another";
    }
    Replace("rsa", manager_, is_away_);
    EXPECT_EQ(base::ReadFile(installation_.Home() / "tls.before/key.pem"), File("ec.key"))
        << "the last pair that a web server took";
    EXPECT_EQ(OnDisk(), "rsa");
    EXPECT_FALSE(std::filesystem::exists(installation_.Home() / "tls.new"));
}

TEST_P(CertificateTest, LeavesAFolderAloneThatIsNotAsTheServerMadeIt) {
    const std::filesystem::path tls = installation_.TlsFolder();
    std::filesystem::create_directory(tls / "archive");
    EXPECT_THROW(Replace("ec", manager_, is_away_), store::InvalidRecord);
    EXPECT_TRUE(std::filesystem::exists(tls / "archive"));
    std::filesystem::rename(tls, folder_ / "elsewhere");
    std::filesystem::create_directory_symlink(folder_ / "elsewhere", tls);
    EXPECT_THROW(Replace("ec", manager_, is_away_), store::InvalidRecord);
    EXPECT_TRUE(std::filesystem::is_symlink(tls));
    EXPECT_TRUE(Audited().empty());
}

TEST_P(CertificateTest, BringsAlongAFileOfAnotherUser) {
    if (base::ReadFile("/proc/sys/fs/protected_hardlinks").front() != '1') {
        GTEST_SKIP() << "this machine lets everyone link it";
    }
    constexpr uid_t kNobody = 65534;
    const std::filesystem::path file = installation_.TlsFolder() / "chain.pem";
    base::WriteFileAtomically(file, "theirs", 0644);
    std::vector<std::filesystem::path> changed{folder_.Path(), installation_.Home()};
    changed.insert(changed.end(), begin(std::filesystem::directory_iterator(installation_.Home())), {});
    for (const std::filesystem::path& each : changed) {
        if (::chown(each.c_str(), kNobody, kNobody) != 0) {
            GTEST_SKIP() << "only root can give files away";
        }
    }
    const CertificateOffer offer = Offer("ec");
    const pid_t child = ::fork();
    if (child == 0) {
        try {
            const bool is_nobody = ::seteuid(kNobody) == 0;
            CertificateFolder folder(installation_);
            folder.Prepare(offer.certificates, offer.key);
            folder.Exchange();
            struct stat copied {};
            ::stat(file.c_str(), &copied);
            ::_exit(is_nobody && copied.st_uid == kNobody && base::ReadFile(file) == "theirs" ? 0 : 1);
        } catch (...) {
            ::_exit(2);
        }
    }
    int status = -1;
    ::waitpid(child, &status, 0);
    EXPECT_EQ(status, 0);
}

LOOKHAVEN_ON_BOTH_ENGINES(CertificateTest);

}  // namespace
}  // namespace lookhaven::admin
