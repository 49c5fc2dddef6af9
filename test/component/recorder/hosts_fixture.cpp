// SPDX-License-Identifier: Apache-2.0
#include "test/component/recorder/hosts_fixture.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>

#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/verify.h"
#include "standalone/ring/inventory.h"
#include "standalone/store/camera_leases.h"
#include "standalone/store/events.h"
#include "standalone/store/hosts.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::test {

namespace {

// Long enough that a busy machine delays no heartbeat for that long.
constexpr const char* kOfflineLimitS = "4";

}  // namespace

Machine::Machine(const std::string& url) {
    base::Installation::CreateFolders(home_);
    base::WriteFileAtomically(home_ / "store", url, 0600);
    fs::create_directory(Folder());
}

Machine::~Machine() {
    recorder_.reset();
    ring::RemoveOrphans(base::Installation(home_));
}

void Machine::BecomeHost(store::Store& store, const std::string& name) {
    id_ = store::Hosts(store).Add({.name = name,
                                   .address = "127.0.0.1",
                                   .port = 8443,
                                   .certificate = "-----BEGIN CERTIFICATE-----\nMII=\n-----END CERTIFICATE-----\n"});
    BeHost(id_);
    const int mount = store::Mounts(store).Add({.name = name, .path = fs::canonical(Folder()), .host_id = id_});
    maintenance::MountFolder::WriteMarker(Folder(), maintenance::MarkerFor(store, mount));
}

void Machine::Start() {
    recorder_.emplace(std::vector<std::string>{RECORDER_PATH, "--home", home_.Path().string(), "--host-offline-limit",
                                               kOfflineLimitS},
                      home_ / "log/recorder");
}

void Machine::Stop(int signal) {
    Signal(signal);
    EXPECT_TRUE(recorder_->Wait());
    recorder_.reset();
}

HostsTest::~HostsTest() {
    for (const Machine& machine : machines_) {
        EXPECT_EQ(machine.Log().find("Sanitizer"), std::string::npos);
        if (HasFailure()) {
            std::printf("%s\n", machine.Log().c_str());
        }
    }
}

TemporaryPostgres& HostsTest::Server() {
    static TemporaryPostgres server;
    return server;
}

void HostsTest::StartHosts(int count) {
    for (int i = 1; i <= count; ++i) {
        AddMachine().BecomeHost(store_, "nvr" + std::to_string(i));
        machines_.back().Start();
    }
    ASSERT_TRUE(Eventually(kLimit, [&] {
        const auto hosts = store::Hosts(store_).All();
        return std::ranges::all_of(hosts, [](const store::Host& host) {
            return host.room == store::HostRoom::kFree && !host.recorder.empty();
        });
    }));
}

int HostsTest::AddCamera(int fixed_host) {
    const int id =
        store::Cameras(store_).Add({.name = "Camera", .profiles = {{.source = kSmallPattern}}, .host_id = fixed_host});
    store::RecordingPlans(store_).Set(id, {.mode = store::RecordMode::kAlways});
    return id;
}

std::map<int, int> HostsTest::Holders() {
    std::map<int, int> holders;
    for (const store::CameraLease& lease : store::CameraLeases(store_).List()) {
        holders[lease.camera_id] = lease.host_id;
    }
    return holders;
}

std::map<int, std::multiset<int>> HostsTest::Recorded() {
    std::map<int, std::multiset<int>> recorded;
    for (const store::Event& event : store::Events(store_).Open()) {
        recorded[event.host_id].insert(event.camera_id);
    }
    return recorded;
}

int HostsTest::OpenEventOf(int camera) {
    for (const store::Event& event : store::Events(store_).Open()) {
        if (event.camera_id == camera) {
            return event.id;
        }
    }
    return 0;
}

bool HostsTest::EventuallyRecorded(const std::map<int, std::multiset<int>>& expected) {
    std::map<int, std::multiset<int>> recorded;
    const bool is_so = Eventually(kLimit, [&] {
        recorded = Recorded();
        return recorded == expected;
    });
    EXPECT_EQ(recorded, expected);
    return is_so;
}

void HostsTest::ExpectNeverRecordedTwice() {
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

void HostsTest::ExpectSound() {
    for (const maintenance::Fault& fault : maintenance::Verify(store_, false).faults) {
        ADD_FAILURE() << fault.problem;
    }
}

void HostsTest::SetStoreUnreachable(bool is_unreachable) const {
    const std::string host = url_.substr(url_.find("host=") + 5, url_.find(' ') - url_.find("host=") - 5);
    const std::string database = url_.substr(url_.find("dbname=") + 7);
    const std::string command = "/usr/lib/postgresql/15/bin/psql -q -h " + host +
                                " -U postgres -d postgres -c 'alter database " + database + " allow_connections " +
                                (is_unreachable ? "false" : "true") + "' -c \"select pg_terminate_backend(pid)" +
                                " from pg_stat_activity where datname = '" + database + "' and " +
                                (is_unreachable ? "true" : "false") + "\" >/dev/null";
    ASSERT_EQ(std::system(command.c_str()), 0);
}

}  // namespace lookhaven::test
