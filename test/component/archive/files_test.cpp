// SPDX-License-Identifier: Apache-2.0
//
// Names of files on mounts, the recording log, and the files that stand for spans.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/archive/recording_log.h"
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
    EXPECT_THROW(ReadSpan(folder.Path()), ArchiveError);
    EXPECT_THROW(ReadSpan(folder / "none.span"), std::system_error);
    EXPECT_THROW(WriteSpan(path, {0, 1, {"../x.mkv"}}), ArchiveError);
}

}  // namespace
}  // namespace lookhaven::test
