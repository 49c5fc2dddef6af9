// SPDX-License-Identifier: Apache-2.0
//
// Hosts that share a store: their records, what is theirs, and the lease of each one's recorder.
#include "standalone/store/hosts.h"

#include <atomic>
#include <utility>

#include "standalone/store/camera_leases.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recorder_lease.h"
#include "standalone/store/settings.h"
#include "standalone/store/shared_mounts.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::Field;

constexpr const char* kCertificate = "-----BEGIN CERTIFICATE-----\nMII=\n-----END CERTIFICATE-----\n";

class HostTest : public StoreTest {
  protected:
    static Host Named(const std::string& name) {
        return {.name = name, .address = name + ".example", .port = 443, .certificate = kCertificate, .version = "1"};
    }
    int AddMount(const std::string& name, const std::string& path, int host, bool is_default = false) {
        return mounts_.Add({.name = name, .path = path, .is_default = is_default, .host_id = host});
    }

    Hosts hosts_{store_};
    Mounts mounts_{store_};
};

TEST_P(HostTest, TheFirstOneGetsTheMountsThatThereAre) {
    const int old = mounts_.Add({.name = "old", .path = "/srv/a"});
    EXPECT_EQ(mounts_.Find(old)->host_id, 0);
    const std::int64_t before = Settings(store_).Revision();
    const int first = hosts_.Add(Named("nvr1"));
    EXPECT_GT(Settings(store_).Revision(), before);
    const int shared = AddMount("shared", "/srv/shared", kAllHosts);
    const int second = hosts_.Add(Named("nvr2"));
    EXPECT_EQ(mounts_.Find(old)->host_id, first);
    EXPECT_EQ(mounts_.Find(shared)->host_id, kAllHosts) << "only the first host finds mounts of a single machine";
    hosts_.Remove(second);
    EXPECT_EQ(hosts_.FindByName("nvr1"), hosts_.Find(first));
    EXPECT_FALSE(hosts_.Find(second));
    EXPECT_GT(hosts_.Add(Named("nvr2")), second) << "an id is never used again, since mounts carry it";
}

TEST_P(HostTest, RecordsThatBreakARuleAreRefused) {
    hosts_.Add(Named("nvr1"));
    const int id = hosts_.Add(Named("nvr3"));
    const Host good = Named("nvr2");
    const std::pair<const char*, Host> refused[] = {
        {"the name of another", With(good, &Host::name, "nvr1")},
        {"no name", With(good, &Host::name, "")},
        {"no address", With(good, &Host::address, "")},
        {"no host's name", With(good, &Host::address, "nvr 2/x")},
        {"port 0", With(good, &Host::port, 0)},
        {"no port", With(good, &Host::port, 65'536)},
        {"no certificate", With(good, &Host::certificate, "")},
        {"a version with a line break", With(good, &Host::version, "1\n2")},
    };
    for (const auto& [why, host] : refused) {
        EXPECT_THROW(hosts_.Add(host), InvalidRecord) << why;
        EXPECT_THROW(hosts_.Update(With(host, &Host::id, id)), InvalidRecord) << why;
    }
    EXPECT_THROW(hosts_.Update(With(good, &Host::id, 99)), NotFound);
    EXPECT_THROW(hosts_.Remove(99), NotFound);
    EXPECT_THAT(hosts_.All(), ElementsAre(Field(&Host::name, "nvr1"), Field(&Host::name, "nvr3")));
}

TEST_P(HostTest, ARecordersCountSurvivesAChangeOfTheRecord) {
    Host host = Named("nvr1");
    host.id = hosts_.Add(host);
    host.room = HostRoom::kFull;
    host.processors = 4;
    hosts_.Report(host);
    ASSERT_TRUE(RecorderLease(store_, host.id).Take(0, "/var on nvr1", 7));
    host.draining = true;
    host.port = 8443;
    hosts_.Update(host);
    host.heartbeat = 1;
    host.recorder = "/var on nvr1";
    EXPECT_EQ(hosts_.Find(host.id), host);
}

TEST_P(HostTest, EachHasALeaseForItsOwnRecorder) {
    const int first = hosts_.Add(Named("nvr1"));
    const int second = hosts_.Add(Named("nvr2"));
    RecorderLease one(store_, first);
    RecorderLease other(store_, second);
    EXPECT_TRUE(one.Take(0, "a", 5));
    EXPECT_FALSE(one.Take(0, "b", 9)) << "somebody was faster";
    EXPECT_TRUE(other.Take(0, "b", 9));
    EXPECT_EQ(one.Current(), (LeaseState{"a", 1, 5}));
    EXPECT_EQ(RecorderLease(store_).Current().holder, "") << "that of a store without hosts";
    one.Release(1, "a");
    EXPECT_EQ(one.Current(), (LeaseState{"", 2, 5}));
    EXPECT_EQ(other.Current(), (LeaseState{"b", 1, 9}));
    EXPECT_FALSE(RecorderLease(store_, 99).Take(0, "c", 1)) << "there is no such host";
}

TEST_P(HostTest, MountsOfTwoHostsMayHaveOnePathAndEachHasADefault) {
    const int first = hosts_.Add(Named("nvr1"));
    const int second = hosts_.Add(Named("nvr2"));
    const int one = AddMount("one", "/srv/a", first);
    const int other = AddMount("other", "/srv/a", second);
    const auto is_default = [this](int id) { return mounts_.Find(id)->is_default; };
    EXPECT_TRUE(is_default(one) && is_default(other));
    EXPECT_THROW(AddMount("inside", "/srv/a/b", second), AlreadyExists);
    EXPECT_THROW(AddMount("shared", "/srv/a", kAllHosts), AlreadyExists) << "every host has it";
    const int shared = AddMount("shared", "/srv/shared", kAllHosts);
    EXPECT_THROW(AddMount("inside", "/srv/shared/b", first), AlreadyExists);
    const int next = AddMount("next", "/srv/b", second, true);
    EXPECT_TRUE(is_default(one) && !is_default(other) && is_default(next) && is_default(shared));
    mounts_.Update(With(*mounts_.Find(next), &Mount::host_id, first));
    EXPECT_TRUE(is_default(one) && is_default(other) && !is_default(next)) << "each still has one";
    EXPECT_THROW(mounts_.Remove(one, true), InvalidRecord) << "the default, beside another";
    mounts_.Remove(other, true);
}

TEST_P(HostTest, AHostThatCamerasWaitForIsNotRemoved) {
    const int host = hosts_.Add(Named("nvr1"));
    const int id = AddCamera();
    EXPECT_EQ(hosts_.HostOfCamera(id), 0);
    Cameras cameras(store_);
    cameras.Update(With(*cameras.Find(id), &Camera::host_id, host));
    EXPECT_THROW(hosts_.Remove(host), InvalidRecord);
    Force("insert into camera_leases (camera_id, host_id, count, next_host_id) values (1, " + std::to_string(host) +
          ", 1, 0)");
    EXPECT_EQ(hosts_.HostOfCamera(id), host);
    cameras.Update(With(*cameras.Find(id), &Camera::host_id, 0));
    hosts_.Remove(host);
    EXPECT_EQ(hosts_.HostOfCamera(id), 0);
}

TEST_P(HostTest, ALeaseOfACameraChangesHandsOnlyAsItWasSeen) {
    const int first = hosts_.Add(Named("nvr1"));
    const int second = hosts_.Add(Named("nvr2"));
    const int id = AddCamera();
    CameraLeases leases(store_);
    const auto seen = [&] { return leases.List().front(); };
    const CameraLease free = seen();
    EXPECT_EQ(free, (CameraLease{.camera_id = id}));
    EXPECT_FALSE(leases.Take(With(free, &CameraLease::camera_id, 99), first, 0)) << "there is no such camera";
    EXPECT_TRUE(leases.Take(free, first, 0));
    EXPECT_FALSE(leases.Take(free, second, 0)) << "somebody was faster";
    leases.SetRates(second, {{id, 300}});
    leases.SetRates(first, {{id, 400}, {99, 1}});
    const CameraLease held = seen();
    EXPECT_EQ(held.bytes_per_second, 400) << "who records it measures it";
    RecorderLease(store_, first).Take(0, "a", 1);
    EXPECT_FALSE(leases.Take(held, second, 0)) << "its host's heartbeat has changed";
    EXPECT_TRUE(leases.Take(held, second, 1)) << "it stands still";
    EXPECT_FALSE(leases.Take(held, first, 0)) << "the lease has another holder now";
    leases.Release(id, first);
    EXPECT_EQ(hosts_.HostOfCamera(id), second) << "what it has lost it cannot give up";
    leases.Move(id, first);
    leases.Release(id, second);
    EXPECT_EQ(seen(), (CameraLease{.camera_id = id, .count = 3, .next_host_id = first, .bytes_per_second = 400}));
    EXPECT_TRUE(leases.Take(seen(), first, 0));
    EXPECT_EQ(seen().next_host_id, 0) << "it was moved once";
    const CameraLease last = seen();
    hosts_.Remove(first);
    EXPECT_EQ(hosts_.HostOfCamera(id), 0);
    EXPECT_FALSE(leases.Take(last, second, 1));
    EXPECT_TRUE(leases.Take(seen(), second, 0));
}

TEST_P(HostTest, OfManyOnOneCameraOneGetsTheLease) {
    const int host = hosts_.Add(Named("nvr1"));
    AddCamera();
    const CameraLease seen = CameraLeases(store_).List().front();
    std::atomic<int> taken = 0;
    StoreTest::InParallel(5, [&](Store& store) { taken += CameraLeases(store).Take(seen, host, 0) ? 1 : 0; });
    EXPECT_EQ(taken, 1);
}

TEST_P(HostTest, OneOfTheHostsThatHaveASharedMountMaintainsItUntilItIsOfflineOrWithoutIt) {
    const int first = hosts_.Add(Named("nvr1"));
    const int second = hosts_.Add(Named("nvr2"));
    const int mount = AddMount("shared", "/srv/shared", kAllHosts);
    SharedMounts shared(store_);
    for (const int host : {first, second, second, 99}) {
        shared.SetPresence(mount, host, true);
    }
    EXPECT_EQ(shared.HostsWith(mount), (std::vector<int>{first, second}));
    EXPECT_FALSE(shared.TakeFree(mount, 99)) << "there is no such host";
    EXPECT_TRUE(shared.TakeFree(mount, first));
    EXPECT_FALSE(shared.TakeFree(mount, second)) << "somebody has it";
    const MountLease stale = shared.Lease(mount);
    EXPECT_TRUE(shared.Renew(mount, first));
    EXPECT_FALSE(shared.TakeOver(mount, second, stale)) << "it has been renewed";
    EXPECT_TRUE(shared.TakeOver(mount, second, shared.Lease(mount)));
    EXPECT_EQ(shared.Lease(mount).host_id, second);
    EXPECT_FALSE(shared.Renew(mount, first));
    const auto change = [&] { mounts_.Add({.name = "added", .path = "/srv/added"}); };
    EXPECT_THROW(shared.ChangeWithLease(mount, first, change), LeaseLost);
    EXPECT_THROW(shared.ChangeWithLease(mount, second,
                                        [&] {
                                            change();
                                            throw LeaseLost("later");
                                        }),
                 LeaseLost);
    EXPECT_EQ(mounts_.List().size(), 1U) << "what was changed without it is undone";
    shared.ChangeWithLease(mount, second, change);
    EXPECT_EQ(mounts_.List().size(), 2U);
    shared.SetPresence(mount, second, false);
    EXPECT_EQ(shared.Lease(mount).host_id, 0);
    EXPECT_TRUE(shared.TakeFree(mount, first));
    hosts_.Remove(first);
    EXPECT_EQ(shared.Lease(mount).host_id, 0);
    EXPECT_EQ(shared.HostsWith(mount), std::vector<int>());
}

TEST_P(HostTest, AfterTheLastHostItsMountsAreASingleMachinesAgain) {
    const int first = hosts_.Add(Named("nvr1"));
    const int second = hosts_.Add(Named("nvr2"));
    const int own = AddMount("own", "/srv/a", first);
    const int far = AddMount("far", "/srv/a", second);
    EXPECT_EQ(mounts_.FindForPlan(0, second)->id, far);
    EXPECT_EQ(mounts_.FindForPlan(own, second)->id, far) << "the other host's mount is not here";
    const int shared = AddMount("shared", "/srv/shared", kAllHosts);
    hosts_.Remove(second);
    hosts_.Remove(first);
    EXPECT_EQ(mounts_.Find(shared)->host_id, 0);
    EXPECT_EQ(mounts_.Find(own)->host_id, 0);
    EXPECT_EQ(mounts_.Find(far)->host_id, second);
    EXPECT_EQ(mounts_.FindForPlan(0)->id, own);
}

LOOKHAVEN_ON_BOTH_ENGINES(HostTest);

}  // namespace
}  // namespace lookhaven::store
