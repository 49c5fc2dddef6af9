// SPDX-License-Identifier: Apache-2.0
//
// What the doctor finds in the state folder and the record store.
#include <string>

#include "standalone/store/store.h"
#include "test/component/doctor/doctor_fixture.h"

namespace lookhaven::doctor {
namespace {

using testing::HasSubstr;

TEST_F(DoctorTest, FaultsOfFolderAndStoreAreFoundAndMendedWithoutLoss) {
    const std::string database = (home_ / "lookhaven.db").string();
    const Fault faults[] = {
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
        {"older store", [&] { UndoLastMigration(); }, "do: lookhaven init"},
        {"no manager", Sql("update users set privilege = 2 where name = 'admin'"), "no account may manage"},
        {"no live source", Sql("update cameras set live_profile = 2 where id = 1"), "camera 1 has no source"},
    };
    ExpectFoundAndMended(faults);
}

TEST_F(DoctorTest, WhatIsLessSafeThanItCouldBeIsNotedAndIsNoFault) {
    Sql("update camera_profiles set source = 'https://cam/' where camera_id = 1")();
    Sql("update cameras set insecure = 1")();
    const cli::Outcome noted = Examine();
    EXPECT_EQ(noted.code, 0) << noted.text;
    EXPECT_THAT(noted.text, HasSubstr("note     cameras\n         the HTTPS certificate of camera 1 is not verified"));
    EXPECT_THAT(Run("doctor --json").text, HasSubstr("\"severity\" : \"note\""));
}

}  // namespace
}  // namespace lookhaven::doctor
