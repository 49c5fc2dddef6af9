// SPDX-License-Identifier: Apache-2.0
//
// Names of files on mounts, the recording log, the files that stand for spans, and links that others planted.
#include <functional>
#include <map>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/archive/mount_file.h"
#include "standalone/archive/recording_log.h"
#include "standalone/archive/recording_reader.h"
#include "standalone/archive/repair.h"
#include "standalone/archive/span_file.h"
#include "test/support/footage/archive_folder.h"

namespace lookhaven::test {
namespace {

using namespace archive;

TEST(Layout, KnowsItsOwnFilesAndNoOthers) {
    const FileName leap_day{3, 1'709'251'199, 12, FileKind::kRecording};
    EXPECT_EQ(PathOf(leap_day), "3/2024-02-29/235959-12.mkv");
    const std::pair<const char*, bool> rows[] = {
        {"3/2024-02-29/235959-12.mkv", true},          {"3/2024-02-29/235959-12.index", true},
        {"3/2024-02-29/000000-2147483647.span", true}, {"3/2023-02-29/235959-12.mkv", false},  // no such day
        {"3/2024-02-29/246000-12.mkv", false},         {"3/2024-02-29/235959-2147483648.mkv", false},
        {"3/2024-2-29/235959-12.mkv", false},          {"03/2024-02-29/235959-12.mkv", false},
        {"3/2024-02-29/235959-12.mkv.new", false},     {"3/2024-02-29/../2024-02-29/235959-12.mkv", false},
        {"-3/2024-02-29/235959-12.mkv", false},        {"0/2024-02-29/235959-12.mkv", false},
        {"3/2024-02-29/235959-0.mkv", false},          {"3/2024-02-29/seconds", false},
        {"3/2024-02-29/holiday.mkv", false},           {"", false},
    };
    for (const auto& [path, is_ours] : rows) {
        const auto name = ParsePath(path);
        EXPECT_EQ(name.has_value(), is_ours) << path;
        EXPECT_EQ(name ? PathOf(*name) : path, path);
    }
    const ArchiveFolder folder;
    EXPECT_THROW(MakeFolderFor(folder / "unplugged", leap_day), std::system_error);
    EXPECT_FALSE(std::filesystem::exists(folder / "unplugged"));
}

TEST(RecordingLog, GivesEverySecondAcrossDays) {
    const ArchiveFolder folder;
    constexpr std::int64_t kMidnight = 86'400 * 20'000;
    std::vector<std::uint8_t> bytes(7, 9);
    EXPECT_FALSE(ReadRecordingLog(folder / "gone", kMidnight, bytes));
    WriteRecordingLog(folder.Path(), kMidnight - 2, kMidnight + 2, 1);
    WriteRecordingLog(folder.Path(), kMidnight + 1, kMidnight + 3, 3);
    ASSERT_TRUE(ReadRecordingLog(folder.Path(), kMidnight - 3, bytes));
    EXPECT_THAT(bytes, testing::ElementsAre(0, 1, 1, 1, 3, 3, 0));
    EXPECT_EQ(std::filesystem::file_size(folder.Path() / DayOf(kMidnight) / "seconds"), 86'400U);
    // A day that lies between logs, and a log that was cut, read as nothing recorded.
    std::filesystem::resize_file(folder.Path() / DayOf(kMidnight) / "seconds", 2);
    std::vector<std::uint8_t> days(3 * 86'400, 9);
    ASSERT_TRUE(ReadRecordingLog(folder.Path(), kMidnight - 1, days));
    EXPECT_EQ(std::count(days.begin(), days.end(), 0), std::ssize(days) - 3);
}

TEST(SpanFile, ReadsBackAndRefusesWhatIsNone) {
    const ArchiveFolder folder;
    const std::filesystem::path path = folder / "a.span";
    const Span span{1'000, 31'000, {"2024-02-29/235959-12.mkv", "2024-03-01/000500-13.mkv"}};
    WriteSpan(path, span);
    EXPECT_EQ(ReadSpan(path), span);
    const std::string good = Contents(path);
    std::vector<std::string> bad{"",
                                 "lookhaven span 2\nbegin 1\nend 2\n",
                                 "lookhaven span 1\nbegin 2\nend 1\n",
                                 "lookhaven span 1\nbegin -2\nend 1\n",
                                 "lookhaven span 1\nbegin 0\nend 7200001\n",
                                 "lookhaven span 1\nbegin 1\nend 99999999999999999999\n",
                                 good + "recording ../../../etc/passwd\n",
                                 good + "recording 2024-02-29/235959-12.index\n",
                                 good + "recording 4/2024-02-29/235959-12.mkv\n",
                                 std::string(200'000, '\n'),
                                 std::string(100, '\0')};
    for (std::size_t size = 0; size < good.size(); ++size) {
        // Cut between lines it is a shorter span; that is how it grows, too.
        if (good[size - (size > 0 ? 1 : 0)] != '\n' || size < good.find("end")) {
            bad.push_back(good.substr(0, size));
        }
    }
    for (const std::string& text : bad) {
        Write(path, text);
        EXPECT_THROW(ReadSpan(path), ArchiveError) << text.substr(0, 200);
    }
    EXPECT_THROW(ReadSpan(folder.Path()), std::system_error);
    EXPECT_THROW(ReadSpan(folder / "none.span"), std::system_error);
    EXPECT_THROW(WriteSpan(path, {0, 1, {"../x.mkv"}}), ArchiveError);
}

std::map<std::string, std::string> AllFiles(const std::filesystem::path& folder) {
    std::map<std::string, std::string> files;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) {
        files[entry.path()] = entry.is_regular_file() ? Contents(entry.path()) : "";
    }
    return files;
}

TEST(Files, NeitherLinksNorPipesLeadOutOfTheMount) {
    namespace fs = std::filesystem;
    constexpr std::int64_t kSecond = 1'709'251'199;
    const FileName name{3, kSecond, 12, FileKind::kRecording};
    const std::string day = DayOf(kSecond);
    const std::string temporary = "235959-12.span." + std::to_string(::getpid()) + ".new";
    const std::string files[] = {"235959-12.mkv", "235959-12.index", "235959-12.span", temporary, "seconds"};
    struct Row {
        const char* name;
        std::function<void(const fs::path& camera, const fs::path& elsewhere)> plant;
        bool is_refused = true;
    };
    for (const Row& row : {
             Row{"the camera's folder is a link", [](auto&camera, auto&to) { fs::create_symlink(to, camera); }},
             Row{"the day's folder is a link",
                 [&](auto&camera, auto&to) {
                     fs::create_directory(camera);
                     fs::create_symlink(to / day, camera / day);
                 }},
             Row{"the files are links",
                 [&](auto&camera, auto&to) {
                     fs::create_directories(camera / day);
                     for (const std::string& file : files) {
                         fs::create_symlink(to / day / file, camera / day / file);
                     }
                 }},
             Row{"the files are pipes",
                 [&](auto&camera, auto&) {
                     fs::create_directories(camera / day);
                     for (const std::string& file : files) {
                         ::mkfifo((camera / day / file).c_str(), 0600);
                     }
                 }},
             Row{"nothing is planted", [](auto&camera, auto&to) { fs::copy(to, camera, fs::copy_options::recursive); },
                 false},
         }) {
        SCOPED_TRACE(row.name);
        const ArchiveFolder folder;
        const fs::path elsewhere = folder / "elsewhere";
        fs::create_directories(elsewhere / day);
        Write(elsewhere / day / files[0], "footage");
        FrameIndexWriter(elsewhere / day / files[1], PlainHeader(kSecond * 1000)).Finish();
        WriteSpan(elsewhere / day / files[2], {1'000, 2'000, {day + "/" + files[0]}});
        WriteRecordingLog(elsewhere, kSecond - 1, kSecond, 1);
        const auto before = AllFiles(elsewhere);
        fs::create_directory(folder / "disk");
        fs::create_symlink(folder / "disk", folder / "mount");  // the owner's choice
        row.plant(folder / "disk" / "3", elsewhere);

        const fs::path recording = folder / "mount" / PathOf(name);
        const auto is_refused = [](const auto& attempt) {
            try {
                attempt();
                return false;
            } catch (const std::system_error&) {
                return true;
            }
        };
        EXPECT_EQ(is_refused([&] { RecordingReader{recording}; }), row.is_refused);
        EXPECT_EQ(is_refused([&] { FrameIndexReader{IndexPathOf(recording)}; }), row.is_refused);
        EXPECT_EQ(is_refused([&] { ReadSpan(fs::path(recording).replace_extension(".span")); }), row.is_refused);
        EXPECT_EQ(is_refused([&] { CloseCrashed(recording); }), row.is_refused);
        EXPECT_EQ(is_refused([&] { WriteRecordingLog(folder / "mount" / "3", kSecond, kSecond + 1, 1); }),
                  row.is_refused);
        std::vector<std::uint8_t> second(1);
        ReadRecordingLog(folder / "mount" / "3", kSecond - 1, second);
        EXPECT_EQ(second[0], row.is_refused ? 0 : 1);
        is_refused([&] { MakeFolderFor(folder / "mount", {3, kSecond + 86'400, 12, FileKind::kRecording}); });
        is_refused([&] { FrameIndexWriter(IndexPathOf(recording), PlainHeader(0)); });
        is_refused([&] { WriteSpan(fs::path(recording).replace_extension(".span"), {0, 1, {}}); });
        RemoveFile(recording);
        EXPECT_EQ(AllFiles(elsewhere), before);
    }
}

}  // namespace
}  // namespace lookhaven::test
