// SPDX-License-Identifier: Apache-2.0
//
// The operator's command line: what each line answers, how it fails, and that no password ever shows.
#include <algorithm>
#include <chrono>
#include <csignal>
#include <fstream>
#include <thread>
#include <tuple>

#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/store/cameras.h"
#include "standalone/store/recorder_lease.h"
#include "standalone/store/users.h"
#include "test/component/cli/program.h"
#include "test/support/postgres/temporary_postgres.h"
#include "test/support/process.h"
#include "test/support/wait.h"

namespace lookhaven::cli {
namespace {

using testing::HasSubstr;

TEST_F(CliTest, WithoutAnInstallationEveryCommandSaysHowToMakeOneAndWrongUsePointsToTheHelp) {
    for (const char* line : {"camera list", "user list", "log show", "log set debug", "demo setup", "doctor"}) {
        Play({{line, 66, "lookhaven init"}});
    }
    Play({{"--json camera list", 66, "\"code\" : 66"}});
    std::filesystem::create_directory(home_);
    Play({{"camera list", 66, "is not a state folder"},
          {"init --home " + folder_.Path().string(), 73, "not empty and is not a state folder"},
          {"init --home /proc/none", 73, "--home"},
          {"version", 0, "lookhaven "},
          {"version --json", 0, "\"version\""},
          {"", 64, "lookhaven --help"},
          {"camera", 64, "lookhaven camera --help"},
          {"frobnicate", 64, "lookhaven --help"},
          {"camera list extra-s3cret", 64, "lookhaven camera list --help"},
          {"user passwd", 64, "lookhaven user passwd --help"},
          {"--help", 0, "doctor"},
          {"camera add --help", 0, "--low-source", "->"}});
}

TEST_F(CliTest, RootLeavesOnlyFilesThatTheOwnerOfTheStateFolderCanUse) {
    if (::geteuid() != 0) {
        GTEST_SKIP() << "needs root";
    }
    constexpr uid_t kNobody = 65534;
    std::filesystem::permissions(folder_, std::filesystem::perms(0755));
    std::filesystem::create_directory(home_);
    ASSERT_EQ(::chown(home_.c_str(), kNobody, kNobody), 0);
    Play({{"init --admin admin", 0, "Added account admin", "", "admin-s3cret\n"},
          {"demo setup", 0, "", "", "viewer-s3cret\n"},
          {"log set debug", 0, ""},
          {"backup '" + folder_.Path().string() + "/backup'", 0, "Backed up"},
          {"mount add " + folder_.Path().string(), 77, ""}});
    for (const auto& entry : std::filesystem::recursive_directory_iterator(home_)) {
        struct stat status {};
        EXPECT_EQ(::lstat(entry.path().c_str(), &status), 0);
        EXPECT_EQ(status.st_uid, kNobody) << entry.path();
        EXPECT_EQ(status.st_gid, kNobody) << entry.path();
    }
}

TEST_F(CliTest, SetUpIsRepeatableAndKeepsWhatIsThere) {
    Play({{"init --admin admin", 65, "no password"},
          {"init --admin admin", 65, "8 to 1024", "", "short\n"},
          {"init --admin Lookhaven", 65, "reserved", "", "admin-s3cret\n"},
          {"init --admin admin", 0, "Added account admin", "", "admin-s3cret\n"},
          {"init --admin admin", 0, "was not changed", "", "other-s3cret\n"},
          {"demo setup", 65, "no password"},
          {"demo setup --json", 0, "\"cameras_added\" : 4", "", "viewer-s3cret\r\n"},
          {"demo setup --json", 0, "\"cameras_added\" : 0"},
          {"--json user list", 0, "\"name\" : \"viewer\""}});
    store::Store store = Open();
    store::Users users(store);
    EXPECT_TRUE(users.CheckPassword("admin", "admin-s3cret"));
    EXPECT_TRUE(users.CheckPassword("viewer", "viewer-s3cret"));
    EXPECT_EQ(users.FindByName("admin")->privilege, store::Privilege::kOwner);
    const int viewer = users.FindByName("viewer")->id;
    for (const store::CameraAccess kind : store::kEveryAccess) {
        EXPECT_THAT(users.DeniedCameras(viewer, kind), testing::ElementsAre(2));
    }
    std::string summary;
    for (const store::Camera& camera : store::Cameras(store).List()) {
        summary += std::to_string(camera.id) + camera.name + (camera.enabled ? "+" : "-") +
                   std::to_string(static_cast<int>(camera.video_type)) + (camera.ptz ? "p" : "") +
                   (camera.audio ? "a" : "") + std::to_string(camera.profiles.size()) + " ";
    }
    EXPECT_EQ(summary, "1Entrance+12 2Parking+3a1 3Warehouse-11 4Gate+1pa1 ");
    for (const char* name : {"", "lookhaven.db", "debug-log"}) {
        EXPECT_EQ(std::filesystem::status(home_ / name).permissions() & std::filesystem::perms(077),
                  std::filesystem::perms::none)
            << name;
    }
}

TEST_F(CliTest, AFileOfSettingsIsRightOrSaysInWhichLineItIsNot) {
    const auto file = folder_ / "lookhaven.conf";
    const std::tuple<const char*, int, const char*> rows[] = {
        {"", 0, "are valid"},
        {"# a comment\n\nLOOKHAVEN_PORT=8081\nLOOKHAVEN_TLS_PORT = \"8444\"\n", 0, "are valid"},
        {"# a comment\nLOOKHAVEN_PROT=8081\n", 78,
         "line 2: there is no setting LOOKHAVEN_PROT; did you mean LOOKHAVEN_PORT?"},
        {"LOOKHAVEN_TLSPORT=1\n", 78, "did you mean LOOKHAVEN_TLS_PORT?"},
        {"LOOKHAVEN_PORT=443\n", 78, "line 1: LOOKHAVEN_PORT must be a number from 1024"},
        {"LOOKHAVEN_PORT\n", 78, "must be a number"},
        {"LOOKHAVEN_PORT=8443\n", 78, "are both 8443"},
        {"LOOKHAVEN_TRUSTED_PROXIES=192.0.2.1, 10.0.0.0/8,2001:db8::/64\n", 0, "are valid"},
        {"LOOKHAVEN_TRUSTED_PROXIES=\n", 0, "are valid"},
        {"LOOKHAVEN_TRUSTED_PROXIES=192.0.2.1,proxy\n", 78, "line 1: proxy is neither an address nor a network"},
        {"LOOKHAVEN_TRUSTED_PROXIES=10.0.0.0/33\n", 78, "10.0.0.0/33 is neither"},
        {"LOOKHAVEN_TRUSTED_PROXIES=::/0\n", 78, "::/0 is neither"},
        {"LOOKHAVEN_TRUSTED_PROXIES=10.0.0.1;\n", 78, "10.0.0.1; is neither"},
    };
    for (const auto& [text, code, has] : rows) {
        base::WriteFileAtomically(file, text);
        Play({{"setting check " + file.string(), code, has}});
    }
    Play({{"setting check " + (folder_ / "none").string(), 0, "are valid"}});
}

TEST_F(DemoTest, AStoreOfAnotherVersionIsLeftAsItIsByAllButInit) {
    const std::string version = std::to_string(store::Store::SchemaVersion());
    Sql({"update schema_version set version = 99",
         "update settings set value = '99' where name = 'schema_compatible'"});
    for (const char* line : {"camera list", "user remove viewer", "verify --repair", "init --admin admin"}) {
        Play({{line, 78, "has schema 99, newer than this program's " + version, "", "admin-s3cret\n"}});
    }
    Sql({"update schema_version set version = " + version,
         "update settings set value = '" + version + "' where name = 'schema_compatible'"});
    UndoLastMigrations();
    for (const char* line : {"camera list", "user remove viewer", "verify --repair"}) {
        Play({{line, 78, "run lookhaven init"}});
    }
    Play({{"init --json", 0, "\"migrations\" : 2"}, {"user list", 0, "viewer"}, {"camera list", 0, "Entrance"}});
}

TEST_F(CliTest, LogLevelsAreSetPerCategoryAndProcess) {
    const std::string self = std::to_string(::getpid());
    Play({{"init", 0, "then the oldest are deleted: lookhaven mount set 1 --limit"},
          {"init", 0, "ready", "deleted"},
          {"log show", 0, "other categories   error", "process"},
          {"log set --category liveview --category 100 debug", 0, "category 100       debug"},
          {"log show", 0, "category player    error"},
          {"log set info --process " + self, 0, "process " + self},
          {"log set off --process " + self, 0, "category 100", "process"},
          {"log set warning", 0, "other categories   warning", "debug"},
          {"log set debug --process 4194305", 65, "no process"},
          {"log set debug --category 512", 64, "--category"},
          {"log set loud", 64, "level"},
          {"log show --json", 0, "\"other_categories\" : 3"}});
}

TEST_F(DemoTest, ForeignersMayNotTouchTheInstallation) {
    std::filesystem::permissions(home_, std::filesystem::perms(::geteuid() == 0 ? 0700 : 0500));
    for (const char* line : {"camera list", "user list", "camera remove 1"}) {
        const Outcome outcome = Run(line, "", true);
        EXPECT_EQ(outcome.code, 77) << line << outcome.text;
        EXPECT_THAT(outcome.text, HasSubstr("run this as the user")) << line;
    }
    std::filesystem::permissions(home_, std::filesystem::perms(0700));
}

std::vector<std::string> NamesIn(const std::filesystem::path& folder) {
    std::vector<std::string> names;
    std::error_code none;
    for (const auto& entry : std::filesystem::directory_iterator(folder, none)) {
        names.push_back(entry.path().filename());
    }
    std::ranges::sort(names);
    return names;
}

TEST_F(DemoTest, RootMakesFilesWhereTheInstallationsOwnerMayNot) {
    if (::geteuid() != 0) {
        GTEST_SKIP() << "needs root";
    }
    constexpr uid_t kOwner = 65534;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(home_)) {
        ASSERT_EQ(::lchown(entry.path().c_str(), kOwner, kOwner), 0) << entry.path();
    }
    ASSERT_EQ(::chown(home_.c_str(), kOwner, kOwner), 0);
    const std::string place = folder_ / "roots";
    ASSERT_EQ(::mkdir(place.c_str(), 0700), 0);
    const std::string failed = place + "/failed";
    std::filesystem::create_symlink(folder_ / "elsewhere", place + "/link");
    Play({{"backup " + place + "/backup", 0, "Backed up"},
          {"emap export 1 " + place + "/map", 0, "Wrote e-map"},
          {"emap export 1 " + place + "/map", 73, "already a file"},
          {"emap export 1 " + place + "/link", 73, "already a file"},
          {"export 1 --from -1h " + failed, 66, "nothing of these cameras"},
          {"event export 999 " + failed, 66, "999"}});
    EXPECT_EQ(NamesIn(place), (std::vector<std::string>{"backup", "link", "map"})) << "nothing of what failed is left";
    EXPECT_FALSE(std::filesystem::exists(folder_ / "elsewhere"));
}

TEST_F(DemoTest, ABackupThatIsCutOffLeavesNoFile) {
    const std::filesystem::path place = folder_ / "place";
    std::filesystem::create_directory(place);
    const base::FileDescriptor lock = base::LockFile(base::Installation(home_).CertificateLockFile());
    const std::filesystem::path work = home_ / "run/backup";
    for (const int signal : {SIGINT, SIGTERM, SIGKILL}) {
        std::filesystem::remove_all(work);
        const pid_t backup = test::InChild([&] {
            ::execl(LOOKHAVEN_PROGRAM, "lookhaven", "--home", home_.c_str(), "backup", "--certificate",
                    (place / "backup").c_str(), nullptr);
        });
        EXPECT_TRUE(test::Eventually([&] { return !NamesIn(work).empty(); })) << "it waits for the lock";
        EXPECT_EQ(NamesIn(place).size(), 1U);
        EXPECT_FALSE(std::filesystem::exists(place / "backup")) << "before it is whole";
        ::kill(backup, signal);
        EXPECT_EQ(WTERMSIG(test::WaitFor(backup)), signal);
        EXPECT_TRUE(test::Eventually([&] { return NamesIn(place).empty(); })) << signal;
    }
}

// Root may write to a folder of somebody else's.
TEST_F(DemoTest, NobodyPutsAFileOrFolderOfHisInThePlaceOfABackup) {
    const std::filesystem::path place = folder_ / "place";
    const std::filesystem::path away = folder_ / "away";
    const std::filesystem::path work = home_ / "run/backup";
    for (const bool swaps_folder : {false, true}) {
        std::filesystem::create_directory(place);
        std::filesystem::remove_all(work);
        base::FileDescriptor lock = base::LockFile(base::Installation(home_).CertificateLockFile());
        const pid_t backup = test::InChild([&] {
            ::execl(LOOKHAVEN_PROGRAM, "lookhaven", "--home", home_.c_str(), "backup", "--certificate",
                    (place / "backup").c_str(), nullptr);
        });
        EXPECT_TRUE(test::Eventually([&] { return !NamesIn(work).empty(); })) << "it waits for the lock";
        ASSERT_EQ(NamesIn(place).size(), 1U);
        if (swaps_folder) {
            std::filesystem::rename(place, away);
            std::filesystem::create_directory(place);
        } else {
            std::ofstream(folder_ / "other") << "not the backup";
            std::filesystem::rename(folder_ / "other", place / NamesIn(place).front());
        }
        lock.Reset();
        EXPECT_EQ(test::WaitFor(backup) == 0, swaps_folder);
        EXPECT_THAT(NamesIn(place), testing::IsEmpty());
    }
    EXPECT_THAT(NamesIn(away), testing::ElementsAre("backup"));
}

TEST_F(CliTest, AnInstallationMayKeepItsStoreInPostgresql) {
    test::TemporaryPostgres server;
    base::Installation::CreateFolders(home_);
    std::ofstream(home_ / "store") << server.NewDatabase() << "\n";
    SetUpDemo();
    const std::string backup = (folder_ / "backup").string();
    const std::string moved = "sqlite:" + (folder_ / "moved.db").string();
    Play({{"camera list", 0, "Entrance"},
          {"user list", 0, "viewer"},
          {"store show", 0, "postgresql:"},
          {"backup " + backup, 0, "Backed up"},
          {"backup " + backup, 73, "already a file"},
          {"restore " + backup, 65, "accounts"},
          {"restore " + backup + "-absent", 66, "absent"},
          {"restore /dev/null", 65, "not a backup"},
          {"store move sqlite:moved.db", 65, "absolute"}});
    EXPECT_FALSE(std::filesystem::exists(home_ / "lookhaven.db"));
    {
        store::Store store = store::Store::Open(base::Installation(home_).StoreUrl());
        store::RecorderLease lease(store);
        lease.Take(lease.Current().count, "another host", 7);
        const std::jthread other([&](const std::stop_token& stop) {
            while (!stop.stop_requested()) {
                std::this_thread::sleep_for(std::chrono::seconds(1));
                lease.Take(lease.Current().count, "another host", 7);
            }
        });
        Play({{"store move " + moved, 69, "another host"}});
    }
    Play({{"store move -", 0, "Moved", "", moved + "\n"},
          {"store move " + moved, 65, "already"},
          {"store show", 0, "moved.db"},
          {"camera list", 0, "Entrance"}});
}

}  // namespace
}  // namespace lookhaven::cli
