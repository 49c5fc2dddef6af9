// SPDX-License-Identifier: Apache-2.0
//
// An installation whose faults the doctor finds: what causes each, and what mends it.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <vector>

#include <unistd.h>

#include "standalone/control/common_config.h"
#include "standalone/doctor/checks.h"
#include "standalone/maintenance/camera_status.h"
#include "test/component/cli/fake_host.h"
#include "test/component/cli/program.h"

namespace lookhaven::doctor {

struct Fault {
    const char* name;
    std::function<void()> cause;
    const char* says;                 // what the doctor must say, in its sentence or remedy
    std::function<void()> mend = {};  // nothing: the first command that the doctor names
    bool can_be_made = true;
};

class DoctorTest : public cli::DemoTest {
  protected:
    // Where the tests run as root, the installation is another user's, as with script/server.
    void SetUp() override;
    void TearDown() override;

    // A web API host that answers so.
    void StartHost(const char* answer = "Status: 401");

    cli::Outcome Examine();

    // Each fault, or note, by itself is found, as the only one; what mends it leaves none and loses nothing.
    void ExpectFoundAndMended(std::span<const Fault> faults, Severity severity = Severity::kFault);

    // Causes and mends of faults.
    std::function<void()> Sql(const std::string& statement);
    static std::function<void()> Shell(const std::string& command);
    std::function<void()> WriteStatus(const std::vector<maintenance::CameraStatus>& cameras);
    std::function<void()> MakeCertificate(int days);
    // Where the remedies' CERTIFICATE and KEY are.
    void MakeOwnersCertificate();
    // By a recorder that is killed.
    void LeaveSegment(std::uint32_t layout_version) const;

    // From then on this process has mounts of its own, where it may mount at all.
    static bool MayMount();

    // The owner of the installation: what this process makes is then as the server's.
    void BecomeOwner() const;

    std::string Recordings() const { return (home_ / "recordings").string(); }

    const bool is_root_ = ::geteuid() == 0;

  private:
    // Runs the first command line that the outcome names as a remedy.
    void DoWhatItSays(const cli::Outcome& outcome);
    // All that a remedy must not lose.
    std::set<std::string> Kept();

    std::unique_ptr<cli::FakeHost> host_;
    std::optional<control::CommonConfigKeeper> recorder_;
};

}  // namespace lookhaven::doctor
