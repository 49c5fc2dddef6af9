// SPDX-License-Identifier: Apache-2.0
//
// What the doctor finds at the mounts that are recorded to.
#include <string>
#include <vector>

#include "standalone/base/installation.h"
#include "standalone/maintenance/mount_status.h"
#include "standalone/store/events.h"
#include "test/component/doctor/doctor_fixture.h"

namespace lookhaven::doctor {
namespace {

using maintenance::MountState;

TEST_F(DoctorTest, FaultsOfMountsAreFoundAndMendedWithoutLoss) {
    const bool may_mount = MayMount();
    const std::string recordings = Recordings();
    const std::string marker = recordings + "/.lookhaven-mount";
    const auto report = [&](const maintenance::MountStatus& status) {
        return [this, status] { maintenance::WriteMountStatus(base::Installation(home_), {status}); };
    };
    const auto report_nothing = [&] { maintenance::WriteMountStatus(base::Installation(home_), {}); };
    const Fault faults[] = {
        {"no mount", Sql("delete from mounts"), "no mount to record to"},
        {"disabled mount", Sql("update mounts set enabled = 0"), "is disabled, so that 2 of the cameras"},
        {"unplugged disk", Shell("mv " + recordings + " " + recordings + "-disk && mkdir " + recordings),
         "do: mount its disk\n", Shell("rmdir " + recordings + " && mv " + recordings + "-disk " + recordings)},
        {"folder gone", Shell("mv " + recordings + " " + recordings + "-disk"), "is not there",
         Shell("mv " + recordings + "-disk " + recordings)},
        {"another's folder", Shell("echo lookhaven mount 2 of another > " + marker), "another mount or installation"},
        {"mount that its owner may not write to", Shell("chmod 500 " + recordings), "does not permit its owner"},
        {"mount of root", Shell("chown 0:0 " + recordings), "belongs to root and cannot", {}, is_root_},
        {"marker of root", Shell("chown 0:0 " + marker + " && chmod 600 " + marker), "cannot be read", {}, is_root_},
        {"read-only mount",
         Shell("mount --bind " + recordings + " " + recordings + " && mount -o remount,bind,ro " + recordings),
         "mounted read-only",
         {},
         may_mount},
        {"full mount",
         Shell("mount -t tmpfs -o size=5m tmpfs " + recordings + " && cp -p " + recordings + "-marker " + marker +
               " && chown 65534 " + recordings + " && head -c 4m /dev/zero > " + recordings + "/greedy"),
         "left, recording needs", Shell("rm " + recordings + "/greedy"), may_mount},
        {"camera's folder of root",
         Shell("mkdir -m 700 " + recordings + "/7"),
         "recordings/7 belongs to root and cannot",
         {},
         is_root_},
        {"camera's folder that its owner may not write to",
         Shell("mkdir " + recordings + "/8 && chown --reference=" + recordings + " " + recordings + "/8 && chmod 500 " +
               recordings + "/8"),
         "recordings/8 does not permit its owner"},
        {"above the limit",
         [&] {
             Sql("update mounts set max_bytes = 10")();
             store::Store store = Open();
             store::Event event;
             event.camera_id = 1, event.mount_id = 2, event.size_bytes = 12;
             store::Events(store).AddAll(std::vector{event});
         },
         "above its limit", [&] { EXPECT_EQ(Run("mount set 2 --limit 1G").code, 0); }},
        {"kept footage that fills the limit",
         [&] {
             Sql("update mounts set max_bytes = 10")();
             store::Store store = Open();
             store::Event event;
             event.camera_id = 1, event.mount_id = 2, event.size_bytes = 10, event.kept = true;
             store::Events(store).AddAll(std::vector{event});
         },
         "whatever else is recorded is deleted at once", [&] { EXPECT_EQ(Run("mount set 2 --limit 1G").code, 0); }},
        {"disk that snapshots fill", report({2, MountState::kSpaceHeld, recordings}),
         "gets no space back from deleted recordings", report_nothing},
        {"disk that fails", report({2, MountState::kFailing, "cannot remove 1/2: Input/output error"}),
         "1/2: Input/output error", report_nothing},
        {"mount of a copy of the state folder", report({2, MountState::kInUse, recordings}),
         "do: stop that recorder, or give", report_nothing},
    };
    ExpectFoundAndMended(faults);
}

}  // namespace
}  // namespace lookhaven::doctor
