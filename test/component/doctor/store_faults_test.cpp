// SPDX-License-Identifier: Apache-2.0
//
// What the doctor finds in the state folder and the record store.
#include <string>

#include "standalone/admin/first_account.h"
#include "standalone/store/store.h"
#include "test/component/doctor/doctor_fixture.h"

namespace lookhaven::doctor {
namespace {

using testing::HasSubstr;

TEST_F(DoctorTest, FaultsOfFolderAndStoreAreFoundAndMendedWithoutLoss) {
    const std::string database = (home_ / "lookhaven.db").string();
    const Fault faults[] = {
        {"state folder that its owner may not write to", Shell("chmod 500 " + home_.string()),
         "does not permit its owner"},
        {"state folder that its owner may not enter", Shell("chmod 0 " + home_.string()), "does not permit its owner"},
        {"part of it that its owner may not enter", Shell("chmod 600 " + home_.string() + "/run"),
         "run does not permit its owner"},
        {"folder that others may enter", Shell("chmod 701 " + home_.string()), "open to other users"},
        {"open folder", Shell("chmod 755 " + home_.string()), "open to other users"},
        {"readable store", Shell("chmod 644 " + database), "lookhaven.db is open"},
        {"store of root", Shell("chown 0:0 " + database), "lookhaven.db belongs to root", {}, is_root_},
        {"store that its owner may not write to", Shell("chmod 400 " + database), "does not permit its owner"},
        {"store that cannot be reached",
         Shell("echo postgresql:host=/none > " + home_.string() + "/store && chmod 600 " + home_.string() +
               "/store && chown --reference=" + database + " " + home_.string() + "/store"),
         "do: check the address in the file \"store\"", Shell("rm " + home_.string() + "/store")},
        {"store with a wrong address",
         Shell("echo nonsense > " + home_.string() + "/store && chmod 600 " + home_.string() +
               "/store && chown --reference=" + database + " " + home_.string() + "/store"),
         "do: check the address in the file \"store\"", Shell("rm " + home_.string() + "/store")},
        {"malformed store",
         Shell("cp " + database + " " + database + "-backup && printf nothing | dd conv=notrunc of=" + database +
               " 2>/dev/null"),
         "do: stop the server, replace the store", Shell("cat " + database + "-backup > " + database)},
        {"newer store",
         [&] {
             Sql("update schema_version set version = 99")();
             Sql("update settings set value = '99' where name = 'schema_compatible'")();
         },
         "update Lookhaven",
         [&] {
             Sql("update schema_version set version = " + std::to_string(store::Store::SchemaVersion()))();
             Sql("update settings set value = '1' where name = 'schema_compatible'")();
         }},
        {"older store", [&] { UndoLastMigrations(); }, "do: lookhaven init"},
        {"no account yet", Sql("delete from users"), "do: lookhaven setup-address\n",
         [&] {
             const std::string said = Run("setup-address").text;
             const std::string token = said.substr(said.find("#setup=") + 7, 48);
             store::Store store = Open();
             const store::HashedPassword password("admin-s3cret");
             admin::AddFirstAccount(store, token, "admin", password, "127.0.0.1", base::TimeSinceBoot());
             EXPECT_EQ(Run("user add viewer", "viewer-s3cret\n").code, 0);
         }},
        {"no manager", Sql("update users set privilege = 2 where name = 'admin'"), "no account may manage"},
        {"no live source", Sql("update cameras set live_profile = 2 where id = 1"), "camera 1 has no source"},
    };
    ExpectFoundAndMended(faults);
}

class SmallDiskTest : public DoctorTest {
  protected:
    void SetUp() override {
        if (!MayMount()) {
            GTEST_SKIP() << "may not mount";
        }
        const std::string home = home_.string();
        Shell("mkdir " + home + " && mount -t tmpfs -o size=128m,mode=700 tmpfs " + home + " && mkdir " + Recordings() +
              " && mount -t tmpfs tmpfs " + Recordings())();
        DoctorTest::SetUp();
    }

    void TearDown() override {
        DoctorTest::TearDown();
        Shell("while umount -Rl " + home_.string() + " 2>/dev/null; do :; done")();
    }
};

TEST_F(SmallDiskTest, WhatTheDiskOfTheStateFolderRefusesIsFoundAndMendedWithoutLoss) {
    const std::string greedy = (home_ / "greedy").string();
    const Fault faults[] = {
        {"nearly full", Shell("head -c 80m /dev/zero > " + greedy), "the disk of the state folder ",
         Shell("rm " + greedy)},
        {"full", Shell("head -c 200m /dev/zero > " + greedy + " 2>/dev/null; true"), "has only 0 B left",
         Shell("rm " + greedy)},
        {"read-only",
         Shell("mount --rbind " + home_.string() + " " + home_.string() + " && mount -o remount,bind,ro " +
               home_.string()),
         "is on a file system that is mounted read-only"},
    };
    ExpectFoundAndMended(faults);
}

TEST_F(DoctorTest, WhatIsLessSafeThanItCouldBeIsNotedAndIsNoFault) {
    const Fault notes[] = {
        {"certificate that is not verified",
         [&] {
             Sql("update camera_profiles set source = 'https://cam/' where camera_id = 1")();
             Sql("update cameras set insecure = 1 where id = 1")();
             EXPECT_THAT(Run("doctor --json").text, HasSubstr("\"severity\" : \"note\""));
         },
         "the HTTPS certificate of camera 1 is not verified"},
        {"disabled mount that nothing is recorded to",
         [&] {
             Sql("update recording_plans set mode = 0")();
             Sql("update mounts set enabled = 0")();
         },
         " is disabled\n"},
        {"certificate that expires soon",
         [&] {
             MakeCertificate(90)();
             MakeOwnersCertificate();
             MakeCertificate(29)();
         },
         " expires on "},
    };
    ExpectFoundAndMended(notes, Severity::kNote);
}

}  // namespace
}  // namespace lookhaven::doctor
