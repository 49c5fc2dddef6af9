// SPDX-License-Identifier: Apache-2.0
//
// Opening and setting up a store: from nothing, again, by several at once, and with what this program must not touch.
#include <algorithm>
#include <atomic>
#include <csignal>
#include <fstream>

#include <sys/stat.h>

#include "standalone/store/copy.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/schema.h"
#include "standalone/store/sessions.h"
#include "standalone/store/settings.h"
#include "standalone/store/users.h"
#include "test/component/store/store_fixture.h"

namespace lookhaven::store {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::ThrowsMessage;

TEST_P(EmptyStore, IsRefusedUntilItIsSetUpAndKeepsItsDataWhenSetUpAgain) {
    EXPECT_THAT([&] { Store::Open(url_); }, ThrowsMessage<SchemaError>(HasSubstr("run lookhaven init")));
    if (GetParam() == Engine::kSqlite) {
        EXPECT_THAT(std::filesystem::directory_iterator(folder_), std::filesystem::directory_iterator())
            << "opening creates nothing";
    }
    EXPECT_EQ(Store::Migrate(url_), Store::SchemaVersion());
    {
        Store store = Store::Open(url_);
        Settings(store).Set("place", "Zürich");
    }
    EXPECT_EQ(Store::Migrate(url_), 0);
    Store store = Store::Open(url_);
    EXPECT_EQ(Settings(store).Find("place"), "Zürich");
    EXPECT_THAT(store.Check(), IsEmpty());
}

TEST_P(EmptyStore, OfAnotherVersionIsRefusedWithTheWayOut) {
    Store::Migrate(url_);
    Force("update schema_version set version = 0");
    EXPECT_THAT([&] { Store::Open(url_); }, ThrowsMessage<SchemaError>(HasSubstr("run lookhaven init")));
    Force("update schema_version set version = 99");
    Force("update settings set value = '99' where name = 'schema_compatible'");
    EXPECT_THAT([&] { Store::Open(url_); }, ThrowsMessage<SchemaError>(HasSubstr("update Lookhaven")));
    EXPECT_THAT([&] { Store::Migrate(url_); }, ThrowsMessage<SchemaError>(HasSubstr("update Lookhaven")));
    EXPECT_EQ(Ask("select version from schema_version"), "99");
}

TEST_P(EmptyStore, ThatANewerProgramHasOnlyAddedToIsUsedButNotCopied) {
    const int own = Store::SchemaVersion();
    Store::Migrate(url_);
    Store before = Store::Open(url_);
    Force("create table additions (id integer not null primary key)");
    Force("alter table cameras add column addition integer not null default 7");
    Force("update schema_version set version = " + std::to_string(own + 1));
    const struct {
        std::string oldest;
        bool is_taken;
    } rows[] = {{std::to_string(own), true},
                {std::to_string(own - 1), true},
                {std::to_string(own + 1), false},
                {"", false},
                {"-1", false},
                {std::to_string(own) + "x", false},
                {"99999999999", false}};
    for (const auto& row : rows) {
        Force("update settings set value = '" + row.oldest + "' where name = 'schema_compatible'");
        EXPECT_EQ(before.IsUpToDate(), row.is_taken) << row.oldest;
        if (!row.is_taken) {
            EXPECT_THROW(Store::Open(url_), SchemaError) << row.oldest;
            EXPECT_THROW(Store::Migrate(url_), SchemaError) << row.oldest;
            continue;
        }
        EXPECT_EQ(Store::Migrate(url_), 0) << "an older program is started again";
        Store store = Store::Open(url_);
        Cameras(store).Add({.name = "Gate", .profiles = {{.source = "test:mjpeg"}}});
        const std::string copied = NewUrl(Engine::kSqlite, "copy" + row.oldest + ".db");
        Store::Migrate(copied);
        Store copy = Store::Open(copied);
        EXPECT_THAT([&] { CopyRecords(store, copy, CopySessions::kNo); },
                    ThrowsMessage<SchemaError>(HasSubstr("update Lookhaven")));
    }
    EXPECT_EQ(Ask("select version from schema_version"), std::to_string(own + 1)) << "nobody takes it back";
    EXPECT_EQ(Ask("select count(*) from cameras where addition = 7"), "2");
}

TEST_P(EmptyStore, OfTheFirstVersionIsBroughtUpWithItsData) {
    for (const char* statement : Migrations().front().statements) {
        Force(statement);
    }
    for (const char* statement :
         {"create table schema_version (version integer not null)", "insert into schema_version (version) values (1)",
          "insert into users (id, name, password_hash, privilege) values (1, 'bob', 'x', 2)",
          "insert into cameras (id, name, enabled, video_type, live_profile, ptz, audio)"
          " values (4, 'Gate', 1, 3, 0, 0, 1)",
          "insert into camera_profiles (camera_id, number, source, width, height, fps)"
          " values (4, 0, 'test:h264', 0, 0, 0), (4, 1, 'https://cam/', 0, 0, 0)",
          "insert into denied_cameras (user_id, camera_id, access) values (1, 4, 2)",
          "update counters set value = 4 where name = 'camera'"}) {
        Force(statement);
    }
    const std::filesystem::path copy = folder_ / "lookhaven.db.schema-1";
    Force("insert into sessions values ('x', 'h', 1, 5, 5, 9)");
    const bool is_copied = GetParam() == Engine::kSqlite;
    const std::filesystem::path cut_off = copy.string() + ".new";
    std::ofstream(cut_off) << "an incomplete copy";
    std::ofstream(cut_off.string() + "-wal") << "half of a log";
    EXPECT_EQ(Store::CopyIfOlder(url_, folder_), is_copied);
    EXPECT_EQ(Store::Migrate(url_), Store::SchemaVersion() - 1);
    EXPECT_FALSE(Store::CopyIfOlder(url_, folder_)) << "it is not older any more";
    if (is_copied) {
        EXPECT_FALSE(std::filesystem::exists(cut_off));
        EXPECT_FALSE(std::filesystem::exists(cut_off.string() + "-wal"));
        EXPECT_EQ(std::filesystem::status(copy).permissions() & std::filesystem::perms(0777),
                  std::filesystem::perms(0600));
        EXPECT_EQ(Store::Migrate("sqlite:" + copy.string()), Store::SchemaVersion() - 1) << "the copy is as old";
        Store store = Store::Open("sqlite:" + copy.string());
        EXPECT_EQ(Cameras(store).Find(4)->name, "Gate");
        EXPECT_THAT(Sessions(store).OfUser(1, 5), IsEmpty());
    }
    Store store = Store::Open(url_);
    EXPECT_EQ(Cameras(store).Find(4)->name, "Gate");
    EXPECT_TRUE(Cameras(store).Find(4)->insecure) << "it was recorded with any certificate";
    EXPECT_EQ(Cameras(store).Add(*Cameras(store).Find(4)), 5);
    EXPECT_THAT(Users(store).DeniedCameras(1, CameraAccess::kPlayback), ElementsAre(4));
    EXPECT_EQ(RecordingPlans(store).Find(4).mode, RecordMode::kNever);
    EXPECT_EQ(Events(store).NextId(), 1);
}

TEST_P(EmptyStore, IsNotCopiedAgainSoonAfterItWasCopiedAhead) {
    using Copy = Store::Copy;
    const std::filesystem::path copy = folder_ / "lookhaven.db.schema-1";
    const std::filesystem::path ahead = copy.string() + ".ahead";
    for (const char* statement : Migrations().front().statements) {
        Force(statement);
    }
    Force("create table schema_version (version integer not null)");
    Force("insert into schema_version (version) values (1)");
    Force("insert into settings (name, value) values ('count', '0')");
    const bool is_copied = GetParam() == Engine::kSqlite;
    const auto count_in_copy = [&] {
        return Connection({Engine::kSqlite, copy.string()})
            .FetchOne<std::string>("select value from settings where name = 'count'");
    };
    for (const auto& [age, expected] :
         {std::pair{std::chrono::minutes(0), "1"}, {std::chrono::minutes(20), "2"}, {std::chrono::minutes(-20), "2"}}) {
        Force("update settings set value = '1' where name = 'count'");
        ASSERT_EQ(Store::CopyIfOlder(url_, folder_, Copy::kAhead), is_copied);
        if (!is_copied) {
            return;
        }
        EXPECT_FALSE(std::filesystem::exists(copy)) << "until the upgrade";
        std::filesystem::last_write_time(ahead, std::filesystem::last_write_time(ahead) - age);
        Force("update settings set value = '2' where name = 'count'");
        EXPECT_TRUE(Store::CopyIfOlder(url_, folder_));
        EXPECT_EQ(count_in_copy(), expected) << age.count();
        EXPECT_FALSE(std::filesystem::exists(ahead));
        std::filesystem::remove(copy);
    }
}

TEST_P(EmptyStore, OfAVersionWithoutSearchInTextsFindsThoseOfItsMarks) {
    int version = 0;
    for (const Migration& migration : Migrations()) {
        if (!migration.on_sqlite.empty()) {
            break;
        }
        std::ranges::for_each(migration.statements, [this](const char* statement) { Force(statement); });
        ++version;
    }
    Force("create table schema_version (version integer not null)");
    Force("insert into schema_version (version) values (" + std::to_string(version) + ")");
    for (const char* values : {"(1, 2, 5, 300, 290, 310, 'Total 12.80', ", "(2, 1, 5, 200, 190, 210, '', ",
                               "(3, 2, 5, 100, 90, 110, 'total 7', ", "(4, 2, 6, 100, 90, 110, 'total 8', "}) {
        Force("insert into marks (id, kind, camera_id, moment_s, start_s, end_s, text, state, mount_id, path, demo)"
              " values " +
              std::string(values) + "1, 1, 'x', 0)");
    }
    EXPECT_EQ(Store::Migrate(url_), Store::SchemaVersion() - version);
    Store store = Store::Open(url_);
    Marks marks(store);
    const auto found = [&] {
        std::vector<int> ids;
        const auto list = marks.List({.camera_ids = {5}, .words = TextQuery("TOTAL"), .newest_first = true});
        std::ranges::transform(list, std::back_inserter(ids), &Mark::id);
        return ids;
    };
    EXPECT_THAT(found(), ElementsAre(1, 3));
    EXPECT_TRUE(marks.Remove(1));
    EXPECT_THAT(found(), ElementsAre(3));
}

TEST_P(EmptyStore, IsSetUpOnceByMany) {
    std::atomic<int> steps = 0;
    InParallel(6, [&] { steps += Store::Migrate(url_); });
    EXPECT_EQ(steps, Store::SchemaVersion());
}

LOOKHAVEN_ON_BOTH_ENGINES(EmptyStore);

TEST_P(StoreTest, CheckNamesACameraWithoutALiveSource) {
    AddCamera();
    EXPECT_THAT(store_.Check(), IsEmpty());
    Force("delete from camera_profiles");
    EXPECT_THAT(store_.Check(), ElementsAre(HasSubstr("camera 1")));
}

class ConcurrentWriters : public StoreTest {};
LOOKHAVEN_ON_BOTH_ENGINES(ConcurrentWriters);

TEST_P(ConcurrentWriters, LoseNothing) {
    const std::int64_t before = Settings(store_).Revision();
    InParallel(4, [](Store& store) {
        for (int i = 0; i < 25; ++i) {
            Cameras(store).Add({.name = "Gate", .profiles = {{.source = "test:mjpeg"}}});
            Settings(store).Set("last", std::to_string(i));
        }
    });
    EXPECT_EQ(Settings(store_).Revision() - before, 4 * 25 * 2);
    EXPECT_EQ(Cameras(store_).List().back().id, 100) << "each writer got ids of its own";
}

TEST_P(StoreTest, HostileTextIsRefusedOrKeptExactly) {
    Settings settings(store_);
    for (const std::string& text : kHostileTexts) {
        EXPECT_EQ(settings.Find(text), std::nullopt) << text;
        try {
            settings.Set("hostile", text);
        } catch (const InvalidRecord&) {
            continue;
        }
        EXPECT_EQ(settings.Find("hostile"), text);
    }
}

TEST_P(StoreTest, ALostServerIsToldFromAFailingStore) {
    try {
        store_.connection().Read([](soci::session& sql) { sql << "select nonsense"; });
        ADD_FAILURE();
    } catch (const StoreError& error) {
        EXPECT_EQ(dynamic_cast<const StoreUnavailable*>(&error), nullptr) << error.what();
    }
    EXPECT_NO_THROW(store_.connection().Read([](soci::session& sql) { sql << "select 1"; }));
    if (GetParam() == Engine::kPostgresql) {
        Store other = Store::Open(url_);
        const int server = other.connection().FetchOne<int>("select pg_backend_pid()").value();
        ::kill(server, SIGSTOP);
        EXPECT_FALSE(other.IsUpToDate()) << "it does not wait for a server that hangs";
        ::kill(server, SIGCONT);
        for (const bool can_write : {false, true}) {
            store_.connection().Read([&](soci::session& sql) {
                sql << std::string("set default_transaction_read_only = ") + (can_write ? "off" : "on");
            });
            EXPECT_EQ(store_.IsUpToDate(), can_write);
            EXPECT_EQ(store_.IsUpToDate(), can_write) << "it can be asked again";
        }
        const auto end = [](soci::session& sql) { sql << "select pg_terminate_backend(pg_backend_pid())"; };
        EXPECT_THROW(store_.connection().Read(end), StoreUnavailable);
        EXPECT_FALSE(store_.IsUpToDate());
        EXPECT_THROW(Store::Open("postgresql:host=/nonexistent"), StoreUnavailable);
    }
}

LOOKHAVEN_ON_BOTH_ENGINES(StoreTest);

class SqliteTest : public EmptyStore {};

TEST_P(SqliteTest, FilesArePrivateWhateverTheMask) {
    const mode_t mask = ::umask(0);
    Store::Migrate(url_);
    Store store = Store::Open(url_);
    Settings(store).Set("a", "b");
    ::umask(mask);
    int files = 0;
    for (const auto& file : std::filesystem::directory_iterator(folder_)) {
        EXPECT_EQ(file.status().permissions(), std::filesystem::perms(0600)) << file;
        ++files;
    }
    EXPECT_EQ(files, 3) << "database, log and index";
}

TEST_P(SqliteTest, WhatIsNoStoreIsAnErrorAndStaysAsItIs) {
    const std::string text(8192, 'x');
    std::ofstream(folder_ / "lookhaven.db") << text;
    std::filesystem::create_directory(folder_ / "folder");
    const std::string folder = folder_.Path().string();
    for (const std::string& url :
         {url_, "sqlite:" + folder + "/folder", "sqlite:" + folder + "/no/such", "sqlite:" + folder + "/a\"b",
          std::string("sqlite:"), std::string(""), std::string("mysql://host/db"),
          std::string("postgresql:host=/nowhere"), folder + "/lookhaven.db"}) {
        EXPECT_THROW(Store::Open(url), StoreError) << url;
        EXPECT_THROW(Store::Migrate(url), StoreError) << url;
    }
    EXPECT_EQ(std::filesystem::file_size(folder_ / "lookhaven.db"), text.size());
}

INSTANTIATE_TEST_SUITE_P(, SqliteTest, testing::Values(Engine::kSqlite), EngineName);

}  // namespace
}  // namespace lookhaven::store
