// SPDX-License-Identifier: Apache-2.0
//
// Changes of cameras: checked and stored as a whole, never over somebody else's, and told without a password.
#include "standalone/admin/cameras.h"

#include <thread>

#include "standalone/admin/change.h"
#include "standalone/base/clock.h"
#include "standalone/camera/isolated_source.h"
#include "standalone/store/audit_log.h"
#include "standalone/store/events.h"
#include "standalone/store/footage_removals.h"
#include "standalone/store/groups.h"
#include "standalone/store/transaction.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::admin {
namespace {

using store::Engine;
using store::EngineName;
using testing::HasSubstr;
using testing::Not;

class CameraChangeTest : public store::StoreTest {
  protected:
    static CameraSetup Gate() {
        CameraSetup setup;
        setup.camera = {.name = "Gate", .profiles = {{.source = "rtsp://192.0.2.1/a"}}};
        setup.credentials = {"root", "camera-s3cret"};
        return setup;
    }

    int AddGate() { return admin::AddCamera(store_, {}, kinds_, Gate()).camera.id; }

    void Set(int id, const CameraEdit& edit, std::optional<std::int64_t> seen = {}) {
        SetCamera(store_, {}, kinds_, id, seen, edit);
    }

    store::AuditEntry LastChange() { return store::AuditLog(store_).List(0, 1).at(0); }

    int AddEvent(int camera, bool recording, bool is_kept) {
        store::Events events(store_);
        store::Event event;
        event.id = events.NextId();
        event.camera_id = camera, event.mount_id = 1, event.recording = recording, event.kept = is_kept;
        events.Begin(event);
        return event.id;
    }

    const media::SourceKinds kinds_ = camera::NetworkKinds();
};

TEST_P(CameraChangeTest, AnAddressIsOfAKnownKindAndHoldsNoSecret) {
    for (const char* good : {"rtsp://192.0.2.1/a?b=c", "http://[2001:db8::1]:8080/", "rtsp://camera"}) {
        RequireSource(kinds_, good);
    }
    for (const char* bad : {"", "file:/etc/passwd", "test:mjpeg", "concat:a|b", "rtsp://", "rtsp:///a",
                            "rtsp://u:p@host/a", "rtsp://host:99999/", "http://a b/", "rtsp://host\\a"}) {
        EXPECT_THROW(RequireSource(kinds_, bad), store::InvalidRecord) << bad;
    }
}

TEST_P(CameraChangeTest, WhatCannotBeStoredAsAWholeIsNotStoredAtAll) {
    const struct {
        const char* what;
        CameraEdit spoil;
    } rows[] = {
        {"no such group", [](CameraSetup& setup) { setup.groups = {7}; }},
        {"no such mount", [](CameraSetup& setup) { setup.plan = store::RecordingPlan{.mount_id = 7}; }},
        {"a wrong plan", [](CameraSetup& setup) { setup.plan = store::RecordingPlan{.hours = "012"}; }},
        {"a wrong password",
         [](CameraSetup& setup) {
             setup.credentials = {"a", "\n"};
         }},
        {"an address of the command line", [](CameraSetup& setup) { setup.camera.profiles[0].source = "file:/a"; }},
        {"no live profile", [](CameraSetup& setup) { setup.camera.live_profile = 2; }},
        {"a stream that fails", [](CameraSetup&) { throw media::SourceError("refused"); }},
    };
    const int id = AddGate();
    for (const auto& row : rows) {
        EXPECT_ANY_THROW(Set(id, [&](CameraSetup& setup) { setup.camera.name = "Yard", row.spoil(setup); }))
            << row.what;
        CameraSetup another = Gate();
        EXPECT_ANY_THROW({
            row.spoil(another);
            admin::AddCamera(store_, {}, kinds_, another);
        }) << row.what;
    }
    EXPECT_EQ(store::Cameras(store_).List().size(), 1);
    EXPECT_EQ(ReadCamera(store_, id).camera.name, "Gate");
    EXPECT_EQ(LastChange().id, 1) << "the log tells of nothing that did not happen";
}

TEST_P(CameraChangeTest, ASourceThatIsThereAlreadyStaysWhateverItsKind) {
    const int file = store::Cameras(store_).Add({.name = "Clip", .profiles = {{.source = "file:/clip.mkv"}}});
    Set(file, [](CameraSetup& setup) { setup.camera.name = "Film"; });
    EXPECT_EQ(ReadCamera(store_, file).camera.name, "Film");
}

TEST_P(CameraChangeTest, SomebodyElsesChangeIsNotOverwritten) {
    const int id = AddGate();
    const auto seen = ToJson(ReadCamera(store_, id))["revision"].asInt64();
    store::Cameras(store_).SetVideoType(id, base::Codec::kH265);  // which the recorder does by itself
    Set(
        id, [](CameraSetup& setup) { setup.camera.name = "Yard"; }, seen);
    const auto rename = [](CameraSetup& setup) { setup.camera.name = "Shed"; };
    const auto is_stale = [this, id](const std::function<void()>& change) {
        try {
            change();
        } catch (const Stale& stale) {
            return stale.Record() == ToJson(ReadCamera(store_, id));
        }
        return false;
    };
    EXPECT_TRUE(is_stale([&] { Set(id, rename, seen); }));
    EXPECT_TRUE(is_stale([&] { RemoveCamera(store_, {}, id, seen, Footage::kKeep); }));
    EXPECT_TRUE(is_stale([&] {
        Set(id, [&](CameraSetup& setup) {
            Set(id, [](CameraSetup& other) { other.camera.ptz = true; });  // while this one looks at the stream
            rename(setup);
        });
    }));
    EXPECT_EQ(ReadCamera(store_, id).camera.name, "Yard");
}

TEST_P(CameraChangeTest, AnOrderIsChangedByWhoHasSeenIt) {
    const std::vector<int> ids = {AddGate(), AddGate()};
    const auto order = [this] { return OrderRecord(store::Cameras(store_).List()); };
    const Json::Value first = order();
    const auto is_stale = [&](const Json::Value& seen) {
        try {
            OrderCameras(store_, {}, seen["revision"].asInt64(), {ids[1], ids[0]});
        } catch (const Stale& stale) {
            return stale.Record() == order() && LastChange().action != "camera.order";
        }
        return false;
    };
    Set(ids[0], [](CameraSetup& setup) { setup.camera.name = "Yard"; });
    EXPECT_EQ(order(), first) << "a camera is no part of it";
    const Json::Value second = OrderCameras(store_, {}, first["revision"].asInt64(), {ids[1], ids[0]});
    EXPECT_EQ(order(), second);
    EXPECT_EQ(OrderCameras(store_, {}, second["revision"].asInt64(), ids), first);
    const int added = AddGate();
    EXPECT_TRUE(is_stale(first)) << "a camera was added";
    RemoveCamera(store_, {}, added, {}, Footage::kKeep);
    EXPECT_TRUE(is_stale(second));
    EXPECT_FALSE(is_stale(first)) << "the order is as it was again";
}

TEST_P(CameraChangeTest, TheLogTellsWhatChangedButNoPassword) {
    const int group = store::Groups(store_).Add({.name = "Yard", .camera_ids = {}});
    const int id = AddGate();
    EXPECT_EQ(LastChange().object, "Gate (1)");
    Set(id, [group](CameraSetup& setup) {
        setup.credentials->password = "other-s3cret";
        setup.groups = {group};
    });
    EXPECT_THAT(LastChange().after, testing::AllOf(HasSubstr(R"("group":[1])"), HasSubstr(R"("password":"changed")")));
    EXPECT_EQ(store::Cameras(store_).FindCredentials(id)->password, "other-s3cret");
    Set(id, [](CameraSetup& setup) { setup.groups.clear(), setup.credentials.reset(); });
    EXPECT_TRUE(store::Groups(store_).Find(group)->camera_ids.empty());
    OrderCameras(store_, {}, {}, {AddGate(), id});
    EXPECT_EQ(LastChange().after, "[2,1]");
    EXPECT_EQ(store::Cameras(store_).List().front().id, 2);
    EXPECT_THROW(OrderCameras(store_, {}, {}, {2}), store::InvalidRecord);
    for (const store::AuditEntry& entry : store::AuditLog(store_).List(0, 9)) {
        EXPECT_THAT(entry.before + entry.after, Not(HasSubstr("s3cret"))) << entry.action;
    }
}

TEST_P(CameraChangeTest, FootageGoesWithItsCameraWhereThatIsWanted) {
    const int kept = AddGate();
    const int removed = AddGate();
    const int other = AddEvent(kept, false, false);
    AddEvent(removed, false, false);
    const int spared = AddEvent(removed, false, true);
    const int growing = AddEvent(removed, true, false);
    std::vector<store::Event> many(2'500, *store::Events(store_).Find(spared));
    for (std::size_t i = 0; i < many.size(); ++i) {
        many[i].kept = false;
        many[i].demo = i >= 1'500;
        many[i].start_s = many[i].end_s = static_cast<std::int64_t>(i);
    }
    store::Events(store_).AddAll(many);
    RemoveCamera(store_, {}, kept, std::nullopt, Footage::kKeep);
    {
        const std::jthread recorder([this, growing] {
            store::Store store = store::Store::Open(url_);
            while (!store::Cameras(store).List().empty()) {
                std::this_thread::yield();
            }
            store::Events(store).Finish(growing, 1, 1, 1);
        });
        RemoveCamera(store_, {}, removed, std::nullopt, Footage::kRemove);
    }
    store::Events events(store_);
    EXPECT_TRUE(events.Find(other) && events.Find(spared));
    EXPECT_FALSE(events.Find(growing)) << "what was being recorded goes, too";
    EXPECT_EQ(events.PendingDeletion(1).size(), 1'502);
    EXPECT_EQ(events.List({.camera_ids = {removed}, .begin_s = -1}).size(), 1)
        << "of demo events, too, nothing is left";
    EXPECT_EQ(events.FootageOfCameras().at(removed).events, 1);
    const int late = AddEvent(removed, true, false);
    store::FootageRemovals removals(store_);
    removals.BeginDeletions();
    ASSERT_TRUE(events.Find(late)) << "the recorder still writes it";
    events.Finish(late, 1, 1, 1);
    removals.BeginDeletions();
    EXPECT_FALSE(events.Find(late));
    EXPECT_TRUE(events.Find(other) && events.Find(spared));
    const int present = AddGate();
    const int its = AddEvent(present, false, false);
    removals.Add(present, base::WallSeconds());
    removals.BeginDeletions();
    EXPECT_TRUE(events.Find(its)) << "whatever is remembered, what a camera has stays while it is there";
    removals.Add(9, 2 * base::WallSeconds());
    EXPECT_EQ(removals.Cameras(), std::vector<int>{9}) << "old ones are deleted";
}

TEST_P(CameraChangeTest, AHostHasAThousandCamerasAtMost) {
    store::InTransaction(store_, [this] {
        for (int i = 1; i < 1'000; ++i) {
            AddCamera();
        }
    });
    AddGate();
    EXPECT_THROW(AddGate(), store::InvalidRecord);
}

TEST_P(CameraChangeTest, IsForManagersHereToo) {
    const Actor viewer{store::Users(store_).Add("eve", "correct horse", store::Privilege::kViewer).id, "eve",
                       "192.0.2.7"};
    const int id = AddGate();
    const std::function<void()> changes[] = {
        [&] { admin::AddCamera(store_, viewer, kinds_, Gate()); },
        [&] { SetCamera(store_, viewer, kinds_, id, {}, [](CameraSetup&) { FAIL() << "called for a viewer"; }); },
        [&] { RemoveCamera(store_, viewer, id, {}, Footage::kRemove); },
        [&] { OrderCameras(store_, viewer, {}, {id}); },
    };
    for (const auto& change : changes) {
        EXPECT_THROW(change(), Forbidden);
    }
    EXPECT_EQ(LastChange().id, 1);
}

LOOKHAVEN_ON_BOTH_ENGINES(CameraChangeTest);

}  // namespace
}  // namespace lookhaven::admin
