// SPDX-License-Identifier: Apache-2.0
//
// Copying a store's records into another one, on the same engine or the other.
#include "standalone/store/copy.h"

#include "standalone/store/access_tokens.h"
#include "standalone/store/connection.h"
#include "standalone/store/emap_pictures.h"
#include "standalone/store/emaps.h"
#include "standalone/store/events.h"
#include "standalone/store/groups.h"
#include "standalone/store/hosts.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/preferences.h"
#include "standalone/store/recorder_lease.h"
#include "standalone/store/sessions.h"
#include "standalone/store/settings.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::Each;
using testing::ElementsAre;

class CopyTest : public StoreTest {
  protected:
    void Fill() {
        AddCamera();
        Cameras(store_).SetCredentials(AddCamera(), Credentials{"admin", "x'; drop table users; --"});
        const int user = Users(store_).Add("bob", "correct horse", Privilege::kViewer).id;
        Users(store_).Deny(user, 2, {CameraAccess::kAudio, CameraAccess::kExport});
        Preferences(store_).Change(user, [](const std::string&) { return R"({"layout":"2"})"; });
        Settings(store_).Set("place", "Zürich :name $1 \\");
        Emaps(store_).Add({.name = "Ground floor"});
        AccessToken till;
        till.name = "till";
        till.camera_ids = {2};
        till.may_pos = true;
        token_ = AccessTokens(store_).Add(till).secret;
        EmapPictures(store_).Put("1-a.png", kPicture, 1);
        EmapPictures(store_).Put("1-b.png", "b", 1);
        std::vector<Event> events;
        for (int i = 0; i < kEvents; ++i) {
            events.push_back({.camera_id = 1,
                              .mount_id = 1,
                              .start_s = 5'000'000'000 + 10 * i,
                              .end_s = 5'000'000'010 + 10 * i,
                              .size_bytes = 6'000'000'000,
                              .audio_codec = i % 2 == 0 ? "" : "aac",
                              .path = "1/20240101/AM/a'b.mkv"});
        }
        Events(store_).AddAll(events);
        Marks(store_).Add(MarkKind::kPos, 1, 100, 0, "2 Tea");
        RecorderLease(store_).Take(0, "elsewhere", 7);
        for (const char* name : {"nvr1", "nvr2"}) {
            const int host =
                Hosts(store_).Add({.name = name,
                                   .address = "nvr",
                                   .port = 8443,
                                   .certificate = "-----BEGIN CERTIFICATE-----\nMII=\n-----END CERTIFICATE-----\n"});
            Mounts(store_).Add({.name = name, .path = "/srv/footage", .host_id = host});
            RecorderLease(store_, host).Take(0, "elsewhere", 7);
        }
    }

    std::string token_;
    const std::string kPicture = std::string(100'000, '\xff') + std::string("\0'", 2);
    static constexpr int kEvents = 1'100;  // more than one fetch of a cursor
};

TEST_P(CopyTest, TakesAllRecordsToEitherEngineAndGoesOnCounting) {
    Fill();
    for (const Engine engine : {Engine::kSqlite, Engine::kPostgresql}) {
        const std::string url = NewUrl(engine, "copy.db");
        Store::Migrate(url);
        Store copy = Store::Open(url);
        EXPECT_GT(CopyRecords(store_, copy, CopySessions::kYes), kEvents);
        EXPECT_EQ(Cameras(copy).List(), Cameras(store_).List());
        EXPECT_EQ(Cameras(copy).FindCredentials(2)->password, "x'; drop table users; --");
        EXPECT_TRUE(Users(copy).CheckPassword("BOB", "correct horse"));
        EXPECT_THAT(Users(copy).DeniedCameras(1, CameraAccess::kAudio), ElementsAre(2));
        EXPECT_EQ(Preferences(copy).Find(1), R"({"layout":"2"})");
        EXPECT_THAT(Users(copy).DeniedCameras(1, CameraAccess::kExport), ElementsAre(2));
        EXPECT_THAT(Users(copy).DeniedCameras(1, CameraAccess::kPlayback), testing::IsEmpty());
        EXPECT_THAT(AccessTokens(copy).FindBySecret(token_).value().camera_ids, ElementsAre(2));
        EXPECT_EQ(EmapPictures(copy).Find("1-a.png"), kPicture);
        EXPECT_EQ(EmapPictures(copy).Find("1-b.png"), "b");
        EXPECT_EQ(Settings(copy).Find("place"), Settings(store_).Find("place"));
        EXPECT_EQ(Settings(copy).Find("installation"), Settings(store_).Find("installation"));
        EXPECT_EQ(Events(copy).List({.camera_ids = {1}}), Events(store_).List({.camera_ids = {1}}));
        EXPECT_EQ(Marks(copy).List({.camera_ids = {1}, .words = TextQuery("tea")}).size(), 1U);
        EXPECT_EQ(RecorderLease(copy).Current().holder, "") << "its holder records into the other store";
        EXPECT_EQ(RecorderLease(copy, 2).Current().holder, "") << "likewise";
        EXPECT_THAT(Hosts(copy).All(), testing::SizeIs(2));
        EXPECT_THAT(Mounts(copy).List(), Each(testing::Field(&Mount::path, "/srv/footage")));
        EXPECT_THAT(copy.Check(), testing::IsEmpty());
        EXPECT_THROW(CopyRecords(store_, copy, CopySessions::kYes), InvalidRecord) << "it has records to lose now";
        EXPECT_EQ(Cameras(copy).Add({.name = "Yard", .profiles = {{.source = "test:mjpeg"}}}), 3);
    }
}

LOOKHAVEN_ON_BOTH_ENGINES(CopyTest);

class UntrustedRecords : public EmptyStore {};

TEST_P(UntrustedRecords, HoldNoStatementsOfTheirOwn) {
    constexpr const char* kHidden =
        "update sqlite_master set sql = replace(sql, 'CREATE VIRTUAL', 'CREATE/**/VIRTUAL') where name = 'f'";
    const struct {
        std::vector<const char*> statements;
        bool refused;
    } rows[] = {{{}, false},
                {{"create table t (a)", "create index i on t (a)"}, false},
                {{"create view v as select 1"}, true},
                {{"create trigger t after insert on users begin delete from cameras; end"}, true},
                {{"create virtual table f using fts5(t)"}, true},
                {{"create virtual table f using fts5(t)", "pragma writable_schema = on", kHidden}, true}};
    int number = 0;
    for (const auto& row : rows) {
        const std::string url = NewUrl(Engine::kSqlite, std::to_string(++number) + ".db");
        Store::Migrate(url);
        {
            Connection connection(StoreAddress::Parse(url));
            for (const char* statement : row.statements) {
                connection.Execute(statement);
            }
        }
        if (row.refused) {
            EXPECT_THROW(RequireTablesOnly(url), InvalidRecord) << row.statements.back();
        } else {
            RequireTablesOnly(url);
        }
    }
}

INSTANTIATE_TEST_SUITE_P(, UntrustedRecords, testing::Values(Engine::kSqlite), EngineName);

}  // namespace
}  // namespace lookhaven::store
