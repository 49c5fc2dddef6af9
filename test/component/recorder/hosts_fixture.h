// SPDX-License-Identifier: Apache-2.0
//
// Several machines that share one store, each with a recorder.
#pragma once

#include <csignal>
#include <deque>
#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/base/file.h"
#include "test/component/recorder/recorder_fixture.h"
#include "test/support/postgres/temporary_postgres.h"

namespace lookhaven::test {

namespace fs = std::filesystem;

constexpr std::chrono::seconds kLimit{40};

// A state folder of its own with one mount, and the recorder that runs for it.
class Machine {
  public:
    explicit Machine(const std::string& url);
    ~Machine();
    Machine(const Machine&) = delete;
    Machine& operator=(const Machine&) = delete;

    void BecomeHost(store::Store& store, const std::string& name);
    void BeHost(int id) const { base::Installation(home_).SetHostId(id); }

    fs::path Folder() const { return home_.Path() / "recordings"; }
    void Start();
    void Signal(int signal) const { recorder_->Signal(signal); }
    void Stop(int signal);
    std::string Log() const { return fs::exists(home_ / "log/recorder") ? base::ReadFile(home_ / "log/recorder") : ""; }

  private:
    TemporaryFolder home_;
    std::optional<Child> recorder_;
    int id_ = 0;
};

class HostsTest : public testing::Test {
  protected:
    HostsTest() : url_(Server().NewDatabase()), store_((store::Store::Migrate(url_), store::Store::Open(url_))) {}
    ~HostsTest() override;

    static TemporaryPostgres& Server();

    Machine& AddMachine() { return machines_.emplace_back(url_); }
    // Starts that many hosts and waits until each has reported that it has room.
    void StartHosts(int count);

    int AddCamera(int fixed_host = 0);

    std::map<int, int> Holders();
    // Cameras by the host that records them.
    std::map<int, std::multiset<int>> Recorded();
    // The id of what is being recorded of the camera, or was when its recorder died; 0: nothing.
    int OpenEventOf(int camera);
    bool EventuallyRecorded(const std::map<int, std::multiset<int>>& expected);

    // For each camera: the recordings of different hosts do not overlap, but for the second that ends are rounded to.
    void ExpectNeverRecordedTwice();
    void ExpectSound();
    // While set the store refuses all connections, like a server that was stopped.
    void SetStoreUnreachable(bool is_unreachable) const;

    const std::string url_;
    store::Store store_;
    std::deque<Machine> machines_;
};

}  // namespace lookhaven::test
