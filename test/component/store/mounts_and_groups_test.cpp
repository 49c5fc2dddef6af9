// SPDX-License-Identifier: Apache-2.0
//
// Mounts, recording plans and camera groups, and what is denied of groups.
#include "standalone/store/events.h"
#include "standalone/store/groups.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/sessions.h"
#include "standalone/store/settings.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::Field;
using testing::IsEmpty;

class MountsAndGroupsTest : public StoreTest {
  protected:
    int AddMount(const std::string& name, const std::string& path) { return mounts_.Add({.name = name, .path = path}); }

    Mounts mounts_{store_};
    Groups groups_{store_};
    RecordingPlans plans_{store_};
    Users users_{store_};
};

TEST_P(MountsAndGroupsTest, OneMountIsTheDefaultAndNoneLiesInAnother) {
    EXPECT_FALSE(mounts_.FindForPlan(0));
    const int first = AddMount("first", "/srv/a");
    EXPECT_THAT(mounts_.List(), ElementsAre(Field(&Mount::is_default, true)));
    Mount second = *mounts_.Find(AddMount("second", "/srv/ab"));
    second.is_default = true;
    second.max_bytes = 5'000'000'000;
    second.max_age_s = 30 * 86400;
    mounts_.Update(second);
    EXPECT_THAT(mounts_.List(), ElementsAre(Field(&Mount::is_default, false), Field(&Mount::is_default, true)));
    second.is_default = false;
    mounts_.Update(second);
    EXPECT_EQ(mounts_.FindForPlan(0)->id, second.id) << "a default is replaced, not taken away";
    EXPECT_EQ(mounts_.FindForPlan(0)->max_bytes, 5'000'000'000);
    EXPECT_EQ(mounts_.FindForPlan(first)->name, "first");
    for (const char* path : {"/srv/a", "/srv/a/b", "/srv"}) {
        EXPECT_THROW(AddMount("third", path), AlreadyExists) << path;
    }
    for (const std::string& path :
         {std::string(), std::string("srv"), std::string("/"), std::string("/c/"), std::string("/c/../d"),
          std::string("/c//d"), "/" + std::string(1024, 'c'), std::string("/c\n"), std::string("/c\0d", 4)}) {
        EXPECT_THROW(AddMount("third", path), InvalidRecord) << path;
    }
    EXPECT_THROW(AddMount("first", "/c"), AlreadyExists);
    EXPECT_THROW(AddMount("", "/c"), InvalidRecord);
    second.max_bytes = -1;
    EXPECT_THROW(mounts_.Update(second), InvalidRecord);
    EXPECT_EQ(mounts_.List().size(), 2U);
}

TEST_P(MountsAndGroupsTest, AMountInUseIsNotForgottenByMistake) {
    const int camera = AddCamera();
    const int normal = AddMount("normal", "/srv/a");
    const int other = AddMount("other", "/srv/b");
    EXPECT_THROW(mounts_.Remove(normal, true), InvalidRecord) << "the default";
    plans_.Set(camera, {.mount_id = other});
    EXPECT_THROW(mounts_.Remove(other, true), InvalidRecord) << "a camera records there";
    plans_.Set(camera, {});
    Events events(store_);
    Event event;
    event.camera_id = camera;
    for (const int mount : {other, normal}) {
        event.mount_id = mount;
        events.AddAll(std::vector{event});
    }
    Marks marks(store_);
    const Mark mark = marks.Add(MarkKind::kPos, camera, 100, 0, "");
    marks.Save(mark.id, other, "a");
    EXPECT_THROW(mounts_.Remove(other, false), InvalidRecord) << "it holds recordings";
    mounts_.Remove(other, true);
    EXPECT_FALSE(mounts_.Find(other) || marks.Find(MarkKind::kPos, mark.id));
    EXPECT_EQ(events.Content(other).events, 0);
    EXPECT_EQ(events.Content(normal).events, 1);
    EXPECT_THROW(mounts_.Remove(other, true), NotFound);
    EXPECT_EQ(AddMount("other", "/srv/b"), other + 1) << "events on a disk in a drawer keep their mount's id";
}

TEST_P(MountsAndGroupsTest, PlansAreKeptPerCameraAndRefusedWhenTheyBreakARule) {
    const int camera = AddCamera();
    const int mount = AddMount("first", "/srv/a");
    EXPECT_EQ(plans_.Find(camera).segment_s, 300) << "without one of its own";
    const std::int64_t before = Settings(store_).Revision();
    plans_.Set(camera, {RecordMode::kAlways, 10, 0, 300, mount, 2, std::string(168, '2')});
    EXPECT_EQ(Settings(store_).Revision(), before + 1);
    const RecordingPlan found = plans_.List().at(camera);
    EXPECT_EQ(found.hours, std::string(168, '2'));
    EXPECT_THAT(std::vector({static_cast<int>(found.mode), found.segment_s, found.pre_s, found.post_s, found.mount_id,
                             found.profile}),
                ElementsAre(1, 10, 0, 300, mount, 2));
    for (const RecordingPlan& plan : std::initializer_list<RecordingPlan>{{.mode = static_cast<RecordMode>(3)},
                                                                          {.segment_s = 9},
                                                                          {.segment_s = 3601},
                                                                          {.pre_s = -1},
                                                                          {.pre_s = 301},
                                                                          {.post_s = 301},
                                                                          {.profile = 3},
                                                                          {.profile = -1},
                                                                          {.hours = "0"},
                                                                          {.hours = std::string(168, '3')}}) {
        EXPECT_THROW(plans_.Set(camera, plan), InvalidRecord) << plan.segment_s << " " << plan.pre_s;
    }
    EXPECT_THROW(plans_.Set(camera, {.mount_id = 99}), NotFound);
    EXPECT_THROW(plans_.Set(99, {}), NotFound);
    EXPECT_EQ(plans_.Find(camera).profile, 2) << "what was refused changed nothing";
    Cameras(store_).Remove(camera);
    EXPECT_THAT(plans_.List(), IsEmpty());
}

TEST_P(MountsAndGroupsTest, WhatIsDeniedOfAGroupIsDeniedOfItsCameras) {
    const std::set<int> cameras = {AddCamera(), AddCamera(), AddCamera()};
    const int yard = groups_.Add({.name = "Yard", .camera_ids = {1, 2}});
    const int user = users_.Add("bob", "correct horse", Privilege::kViewer).id;
    users_.Deny(user, 3, {CameraAccess::kAudio});
    users_.DenyGroup(user, yard, {CameraAccess::kPlayback, CameraAccess::kAudio});
    users_.AllowGroup(user, yard, {CameraAccess::kLive});
    EXPECT_THAT(users_.DeniedCameras(user, CameraAccess::kLive), IsEmpty());
    EXPECT_THAT(users_.DeniedCameras(user, CameraAccess::kPlayback), ElementsAre(1, 2));
    EXPECT_THAT(users_.DeniedCameras(user, CameraAccess::kAudio), ElementsAre(1, 2, 3));
    EXPECT_THAT(users_.DeniedCameras(user, CameraAccess::kExport), ElementsAre(1, 2)) << "what cannot be played";
    EXPECT_THAT(users_.DeniedGroups(user, CameraAccess::kPlayback), ElementsAre(yard));
    EXPECT_THAT(users_.DeniedGroups(user, CameraAccess::kLive), IsEmpty());

    Sessions sessions(store_);
    const int other = users_.Add("eve", "correct horse", Privilege::kViewer).id;
    const struct {
        const char* change;
        std::set<int> cameras;
        bool ends;
    } rows[] = {{"the same", {1, 2}, false}, {"less", {1}, false}, {"more", {1, 3}, true}, {"exchanged", {2}, true}};
    for (const auto& row : rows) {
        const std::string denied = sessions.Create(user, 100).secret;
        const std::string free = sessions.Create(other, 100).secret;
        groups_.Update({yard, "Yard", row.cameras});
        EXPECT_EQ(sessions.FindBySecret(denied, 101).has_value(), !row.ends) << row.change;
        EXPECT_TRUE(sessions.FindBySecret(free, 101)) << row.change;
    }
    const std::string session = sessions.Create(other, 100).secret;
    users_.DenyGroup(other, yard, {CameraAccess::kLive});
    EXPECT_FALSE(sessions.FindBySecret(session, 101));
    groups_.Remove(yard);
    EXPECT_THAT(users_.DeniedCameras(user, CameraAccess::kPlayback), IsEmpty());
    EXPECT_THROW(users_.DenyGroup(user, yard), NotFound);
    EXPECT_THROW(groups_.Remove(yard), NotFound);
}

TEST_P(MountsAndGroupsTest, WhatMayNotBePlayedIsNotExportedEither) {
    const int id = users_.Add("bob", "correct horse", Privilege::kViewer).id;
    users_.Deny(id, 2);
    users_.Allow(id, 2, {CameraAccess::kPlayback});
    users_.Deny(id, 6, {CameraAccess::kExport});
    users_.Deny(id, 7, {CameraAccess::kPlayback});
    EXPECT_THAT(users_.DeniedCameras(id, CameraAccess::kExport), ElementsAre(2, 6, 7));
    EXPECT_THAT(users_.DeniedCameras(id, CameraAccess::kPlayback), ElementsAre(7));
    users_.Allow(id, 7, {CameraAccess::kPlayback});
    EXPECT_THAT(users_.DeniedCameras(id, CameraAccess::kExport), ElementsAre(2, 6));
}

TEST_P(MountsAndGroupsTest, GroupsKeepCamerasThatWereRemovedAndTakeNoUnknownOnes) {
    AddCamera();
    AddCamera();
    const int yard = groups_.Add({.name = "Hof 門", .camera_ids = {1, 2}});
    const int empty = groups_.Add({.name = "Empty", .camera_ids = {}});
    Cameras(store_).Remove(2);
    groups_.Update({yard, "Yard", {1, 2}});
    EXPECT_THAT(groups_.Find(yard)->camera_ids, ElementsAre(1, 2)) << "its recordings are still there";
    EXPECT_THAT(groups_.List().at(1).camera_ids, IsEmpty());
    EXPECT_THROW(groups_.Update({empty, "Empty", {2}}), NotFound);
    EXPECT_THROW(groups_.Add({.name = "Third", .camera_ids = {9}}), NotFound);
    EXPECT_THROW(groups_.Add({.name = "Yard", .camera_ids = {}}), AlreadyExists);
    EXPECT_THROW(groups_.Update({empty, "Yard", {}}), AlreadyExists);
    EXPECT_THROW(groups_.Add({.name = "", .camera_ids = {}}), InvalidRecord);
    EXPECT_EQ(groups_.List().size(), 2U);
}

LOOKHAVEN_ON_BOTH_ENGINES(MountsAndGroupsTest);

}  // namespace
}  // namespace lookhaven::store
