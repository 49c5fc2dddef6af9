// SPDX-License-Identifier: Apache-2.0
//
// Backups: what comes back on another machine, and what is taken for none.
#include "standalone/backup/backup.h"

#include <fstream>
#include <functional>

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/base/file.h"
#include "standalone/emap/pictures.h"
#include "standalone/store/access_tokens.h"
#include "standalone/store/cameras.h"
#include "standalone/store/emap_pictures.h"
#include "standalone/store/users.h"
#include "test/support/folder.h"

namespace lookhaven::backup {
namespace {

namespace fs = std::filesystem;

class BackupTest : public testing::Test {
  protected:
    static base::Installation SetUpHome(const fs::path& home) {
        base::Installation::CreateFolders(home);
        base::Installation installation(home);
        store::Store::Migrate(installation.StoreUrl());
        return installation;
    }

    fs::path File(const std::string& name) const { return folder_ / name; }

    Summary Write(Certificate certificate) {
        const base::FileDescriptor file = base::OpenFile(File("backup"), O_WRONLY | O_CREAT | O_TRUNC);
        store::Store store = store::Store::Open(old_.StoreUrl());
        return backup::Write(old_, store, file.Get(), certificate, "1.2.3");
    }

    Summary Restore(const std::string& name) {
        return backup::Restore(new_, base::OpenFile(File(name), O_RDONLY).Get());
    }

    test::TemporaryFolder folder_;
    const base::Installation old_ = SetUpHome(folder_ / "old");
    const base::Installation new_ = SetUpHome(folder_ / "new");
};

TEST_F(BackupTest, BringsWhatTheStoreHoldsMapsAndTheCertificateToAnotherMachine) {
    std::string image;
    std::string secret;
    int yard = 0;
    const std::string of_other_host = "1-0123456789abcdef.svg";
    {
        store::Store store = store::Store::Open(old_.StoreUrl());
        store::Users(store).Add("bob", "correct horse", store::Privilege::kOwner);
        yard = store::Cameras(store).Add({.name = "Yard", .profiles = {{.source = "test:mjpeg"}}, .max_age_s = 86400});
        secret = store::AccessTokens(store)
                     .Add({.name = "Till", .camera_ids = {yard}, .may_pos = true, .creator = "bob"})
                     .secret;
        const int map = store::Emaps(store).Add({.name = "Ground floor"});
        image = emap::Pictures(store, old_.Home()).Write("<svg/>");
        store::Emaps(store).SetImage(map, image);
        store::EmapPictures(store).Put(of_other_host, "<svg>2</svg>", 0);
        store::Emaps(store).SetImage(store::Emaps(store).Add({.name = "Yard"}), of_other_host);
    }
    base::WriteFileAtomically(old_.TlsFolder() / "key.pem", "secret");
    fs::create_directory(old_.SigningKeyFile().parent_path());
    base::WriteFileAtomically(old_.SigningKeyFile(), "signs exports");
    fs::create_directory(old_.RunFolder() / "backup");  // what a killed one left
    std::ofstream(old_.RunFolder() / "backup" / "records.db") << "half";

    EXPECT_FALSE(Write(Certificate::kLeftOut).has_certificate);
    fs::copy_file(File("backup"), File("without"));
    EXPECT_TRUE(Write(Certificate::kIncluded).has_certificate);
    EXPECT_FALSE(fs::exists(old_.RunFolder() / "backup"));
    const Summary restored = Restore("backup");
    EXPECT_EQ(restored.version, "1.2.3");
    EXPECT_EQ(restored.pictures, 2);
    EXPECT_EQ(base::ReadFile(new_.TlsFolder() / "key.pem"), "secret");
    EXPECT_EQ(base::ReadFile(new_.SigningKeyFile()), "signs exports");
    EXPECT_EQ(fs::status(new_.SigningKeyFile().parent_path()).permissions(), fs::perms::owner_all);
    const base::Installation third = SetUpHome(folder_ / "third");
    backup::Restore(third, base::OpenFile(File("without"), O_RDONLY).Get());
    EXPECT_FALSE(fs::exists(third.SigningKeyFile()));
    store::Store store = store::Store::Open(new_.StoreUrl());
    EXPECT_TRUE(store::Users(store).CheckPassword("bob", "correct horse"));
    EXPECT_EQ(store::Cameras(store).List().at(0).max_age_s, 86400);
    const auto token = store::AccessTokens(store).FindBySecret(secret);
    ASSERT_TRUE(token);
    EXPECT_EQ(token->camera_ids, std::set{yard});
    EXPECT_EQ(emap::Pictures(store, new_.Home()).Read(image), "<svg/>");
    EXPECT_EQ(emap::Pictures(store, new_.Home()).Read(of_other_host), "<svg>2</svg>");
    EXPECT_FALSE(store::EmapPictures(store).Find(of_other_host)) << "once is enough";
    EXPECT_THROW(Restore("backup"), store::InvalidRecord) << "the account would be lost";
}

TEST_F(BackupTest, WhatIsNoWholeBackupLeavesEverythingAsItWas) {
    Write(Certificate::kLeftOut);
    const std::string whole = base::ReadFile(File("backup"));
    base::WriteFileAtomically(File("cut"), whole.substr(0, whole.size() / 2));
    base::WriteFileAtomically(File("text"), "no backup at all");
    base::WriteFileAtomically(File("empty"), "");
    const auto make = [&](const std::string& name, const std::function<void(TarWriter&)>& add) {
        const base::FileDescriptor file = base::OpenFile(File(name), O_WRONLY | O_CREAT);
        TarWriter tar(file.Get());
        add(tar);
        tar.Finish();
    };
    const std::string digest(64, 'a');
    const std::string manifest = R"({"lookhaven_backup":1,"file":[{"name":"records.db","size":1,"sha256":")";
    make("nothing", [](TarWriter&) {});
    make("outside", [](TarWriter& tar) { tar.AddText("emaps/../../escaped", "x"); });
    make("absolute", [](TarWriter& tar) { tar.AddText("/tmp/escaped", "x"); });
    make("foreign", [](TarWriter& tar) { tar.AddText("tls/other.pem", "x"); });
    make("no picture", [](TarWriter& tar) { tar.AddText("emaps/map.png", "x"); });
    make("too large", [](TarWriter& tar) { tar.AddText("tls/key.pem", std::string((1U << 20U) + 1, 'x')); });
    make("endless", [](TarWriter& tar) { tar.AddText("records.db", "x"); });
    make("twice", [](TarWriter& tar) {
        tar.AddText("records.db", "x");
        tar.AddText("records.db", "y");
    });
    make("false hash", [&](TarWriter& tar) {
        tar.AddText("records.db", "x");
        tar.AddText("manifest.json", manifest + digest + "\"}]}");
    });
    make("false types", [&](TarWriter& tar) { tar.AddText("manifest.json", R"({"lookhaven_backup":[1]})"); });
    make("no records", [&](TarWriter& tar) { tar.AddText("manifest.json", R"({"lookhaven_backup":1})"); });
    for (const char* name : {"cut", "text", "empty", "nothing", "outside", "absolute", "foreign", "no picture",
                             "too large", "endless", "twice", "false hash", "false types", "no records"}) {
        EXPECT_THROW(Restore(name), Malformed) << name;
        EXPECT_FALSE(fs::exists(new_.RunFolder() / "backup")) << name;
    }
    EXPECT_FALSE(fs::exists(folder_ / "escaped"));
    EXPECT_EQ(Restore("backup").pictures, 0) << "and a whole one still can be restored";
}

}  // namespace
}  // namespace lookhaven::backup
