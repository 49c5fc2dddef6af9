// SPDX-License-Identifier: Apache-2.0
//
// Several machines that share one store, each with a recorder.
#pragma once

#include <algorithm>
#include <csignal>
#include <cstdlib>
#include <deque>
#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "standalone/base/file.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/verify.h"
#include "standalone/ring/inventory.h"
#include "standalone/store/camera_leases.h"
#include "standalone/store/events.h"
#include "standalone/store/hosts.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "test/component/recorder/recorder_fixture.h"
#include "test/support/postgres/temporary_postgres.h"

namespace lookhaven::test {

namespace fs = std::filesystem;

// Long enough that a busy machine delays no heartbeat for that long.
constexpr const char* kOfflineLimitS = "4";
constexpr std::chrono::seconds kLimit{40};

// A state folder of its own with one mount, and the recorder that runs for it.
class Machine {
  public:
    explicit Machine(const std::string& url) {
        base::Installation::CreateFolders(home_);
        base::WriteFileAtomically(home_ / "store", url, 0600);
        fs::create_directory(Folder());
    }
    ~Machine() {
        recorder_.reset();
        ring::RemoveOrphans(base::Installation(home_));
    }
    Machine(const Machine&) = delete;
    Machine& operator=(const Machine&) = delete;

    void BecomeHost(store::Store& store, const std::string& name) {
        id_ =
            store::Hosts(store).Add({.name = name,
                                     .address = "127.0.0.1",
                                     .port = 8443,
                                     .certificate = "-----BEGIN CERTIFICATE-----\nMII=\n-----END CERTIFICATE-----\n"});
        BeHost(id_);
        const int mount = store::Mounts(store).Add({.name = name, .path = fs::canonical(Folder()), .host_id = id_});
        maintenance::MountFolder::WriteMarker(Folder(), maintenance::MarkerFor(store, mount));
    }
    void BeHost(int id) const { base::Installation(home_).SetHostId(id); }

    fs::path Folder() const { return home_.Path() / "recordings"; }
    void Start() {
        recorder_.emplace(std::vector<std::string>{RECORDER_PATH, "--home", home_.Path().string(),
                                                   "--host-offline-limit", kOfflineLimitS},
                          home_ / "log/recorder");
    }
    void Signal(int signal) const { recorder_->Signal(signal); }
    void Stop(int signal) {
        Signal(signal);
        EXPECT_TRUE(recorder_->Wait());
        recorder_.reset();
    }
    std::string Log() const { return fs::exists(home_ / "log/recorder") ? base::ReadFile(home_ / "log/recorder") : ""; }

  private:
    TemporaryFolder home_;
    std::optional<Child> recorder_;
    int id_ = 0;
};

class HostsTest : public testing::Test {
  protected:
    HostsTest() : url_(Server().NewDatabase()), store_((store::Store::Migrate(url_), store::Store::Open(url_))) {}
    ~HostsTest() override {
        for (const Machine& machine : machines_) {
            EXPECT_EQ(machine.Log().find("Sanitizer"), std::string::npos);
            if (HasFailure()) {
                std::printf("%s\n", machine.Log().c_str());
            }
        }
    }

    static TemporaryPostgres& Server() {
        static TemporaryPostgres server;
        return server;
    }

    Machine& AddMachine() { return machines_.emplace_back(url_); }
    // All of them run and say that they have room.
    void StartHosts(int count) {
        for (int i = 1; i <= count; ++i) {
            AddMachine().BecomeHost(store_, "nvr" + std::to_string(i));
            machines_.back().Start();
        }
        ASSERT_TRUE(Eventually(kLimit, [&] {
            const auto hosts = store::Hosts(store_).All();
            return std::ranges::all_of(hosts,
                                       [](const store::Host& host) { return host.has_room && !host.recorder.empty(); });
        }));
    }

    int AddCamera(int fixed_host = 0) {
        const int id = store::Cameras(store_).Add(
            {.name = "Camera", .profiles = {{.source = kSmallPattern}}, .host_id = fixed_host});
        store::RecordingPlans(store_).Set(id, {.mode = store::RecordMode::kAlways});
        return id;
    }

    std::map<int, int> Holders() {
        std::map<int, int> holders;
        for (const store::CameraLease& lease : store::CameraLeases(store_).List()) {
            holders[lease.camera_id] = lease.host_id;
        }
        return holders;
    }
    // Cameras by the host to whose mount they are being recorded.
    std::map<int, std::multiset<int>> Recorded() {
        std::map<int, std::multiset<int>> recorded;
        for (const store::Event& event : store::Events(store_).Open()) {
            recorded[store::Hosts(store_).HostOfMount(event.mount_id)].insert(event.camera_id);
        }
        return recorded;
    }
    bool EventuallyRecorded(const std::map<int, std::multiset<int>>& expected) {
        const bool is_so = Eventually(kLimit, [&] { return Recorded() == expected; });
        EXPECT_EQ(Recorded(), expected);
        return is_so;
    }

    // Of each camera, the recordings of different hosts follow one another, but for the second that ends are rounded
    // to.
    void ExpectNeverRecordedTwice() {
        std::map<int, std::vector<store::Event>> events;
        for (const auto& [camera, holder] : Holders()) {
            store::EventFilter filter;
            filter.camera_ids = {camera};
            events[camera] = store::Events(store_).List(filter);
        }
        for (auto& [camera, list] : events) {
            std::ranges::sort(list, {}, &store::Event::start_s);
            for (std::size_t i = 1; i < list.size(); ++i) {
                EXPECT_LE(list[i - 1].end_s, list[i].start_s + 1) << "camera " << camera << " at " << list[i].start_s;
            }
        }
    }
    void ExpectSound() {
        for (const maintenance::Fault& fault : maintenance::Verify(store_, false).faults) {
            ADD_FAILURE() << fault.problem;
        }
    }
    // The store refuses everybody, as a server that was stopped.
    void SetStoreAway(bool is_away) const {
        const std::string host = url_.substr(url_.find("host=") + 5, url_.find(' ') - url_.find("host=") - 5);
        const std::string database = url_.substr(url_.find("dbname=") + 7);
        const std::string command = "/usr/lib/postgresql/15/bin/psql -q -h " + host +
                                    " -U postgres -d postgres -c 'alter database " + database + " allow_connections " +
                                    (is_away ? "false" : "true") + "' -c \"select pg_terminate_backend(pid)" +
                                    " from pg_stat_activity where datname = '" + database + "' and " +
                                    (is_away ? "true" : "false") + "\" >/dev/null";
        ASSERT_EQ(std::system(command.c_str()), 0);
    }

    const std::string url_;
    store::Store store_;
    std::deque<Machine> machines_;
};

}  // namespace lookhaven::test
