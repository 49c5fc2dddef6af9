// SPDX-License-Identifier: Apache-2.0
//
// Copies of recordings and spans, as ffprobe sees them.
#include <csignal>
#include <fcntl.h>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/archive/span_file.h"
#include "standalone/base/file.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/media/source.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"

namespace lookhaven::test {
namespace {

using namespace media;

constexpr std::int64_t kStartMs = 10'000;

class ExportOf : public testing::Test {
  protected:
    ExportOf() {
        const Clip& clip = MakeClip(kH264, "-c:a aac -ar 16000");
        Record(clip, folder_ / "1970-01-01/000010-1.mkv", true, SIZE_MAX, kStartMs);
        Record(clip, folder_ / "1970-01-01/000014-2.mkv", false, SIZE_MAX, kStartMs + 4000);
        archive::WriteSpan(folder_ / "1970-01-01/000010-3.span",
                           {kStartMs + 1500, kStartMs + 6000, {"1970-01-01/000010-1.mkv", "1970-01-01/000014-2.mkv"}});
    }

    ArchiveFolder folder_;
    std::filesystem::path out_ = folder_ / "out.mkv";
};

TEST_F(ExportOf, RecordingsAndSpansToFilesAndPipes) {
    struct Row {
        const char* recording;
        ExportOptions options;
        const char* probed;
        const char* duration;
    };
    // The key frames are a second apart; a copy ends at its last frame.
    const Row rows[] = {
        {"000010-1.mkv", {}, "h264,100\naac,6[0-9]\n", "3.9"},
        {"000010-1.mkv", {false, {}, {}}, "h264,100\n", "3.9"},
        {"000014-2.mkv", {}, "h264,100\naac,6[0-9]\n", "3.9"},
        {"000010-1.mkv", {true, kStartMs + 1500, kStartMs + 2500}, "h264,38\naac,2[0-9]\n", "1.4"},
        {"000010-3.span", {}, "h264,125\naac,7[0-9]\n", "4.9"},
        {"000010-3.span", {false, kStartMs + 3500, {}}, "h264,75\n", "2.9"},
    };
    for (const Row& row : rows) {
        const std::filesystem::path path = folder_ / "1970-01-01" / row.recording;
        const base::FileDescriptor file = base::OpenFile(out_, O_RDWR | O_CREAT | O_TRUNC);
        LoadRemuxLibrary().Copy(path, file.Get(), row.options);
        EXPECT_THAT(Probe(out_), testing::MatchesRegex(row.probed)) << path;
        EXPECT_THAT(Shell("ffprobe -v error -show_entries format=duration -of csv=p=0 " + out_.string()),
                    testing::StartsWith(row.duration))
            << path;

        int ends[2] = {};
        ASSERT_EQ(::pipe2(ends, O_CLOEXEC), 0);
        base::FileDescriptor from(ends[0]);
        base::FileDescriptor to(ends[1]);
        std::string received;
        std::size_t announced = 0;
        ExportOptions options = row.options;
        options.announce = [&announced](std::int64_t size_bytes) { announced = static_cast<std::size_t>(size_bytes); };
        std::jthread receiver([&] {
            char block[4096];
            for (ssize_t got = 0; (got = ::read(from.Get(), block, sizeof(block))) > 0;) {
                received.append(block, static_cast<std::size_t>(got));
            }
        });
        LoadRemuxLibrary().Copy(path, to.Get(), options);
        to.Reset();
        receiver.join();
        EXPECT_EQ(received.size(), announced) << path;
        EXPECT_LT(received.size(), 2 * std::filesystem::file_size(out_) + 200'000) << path;
        Write(out_, received);
        EXPECT_THAT(Probe(out_), testing::MatchesRegex(row.probed)) << path << ", through a pipe";
    }
}

TEST_F(ExportOf, NothingAndToNobodyFails) {
    const std::filesystem::path recording = folder_ / "1970-01-01/000010-1.mkv";
    const RemuxLibrary& libav = LoadRemuxLibrary();
    const base::FileDescriptor null = base::OpenFile("/dev/null", O_WRONLY);
    EXPECT_THROW(libav.Copy(recording, null.Get(), {true, kStartMs + 5000, {}}), SourceError);
    EXPECT_THROW(libav.Copy(folder_ / "none.mkv", null.Get(), {}), std::system_error);
    const base::FileDescriptor full = base::OpenFile("/dev/full", O_WRONLY);
    EXPECT_THROW(libav.Copy(recording, full.Get(), {}), std::system_error);
    Record(MakeClip(kMjpeg), folder_ / "1970-01-01/000018-4.mkv", true, SIZE_MAX, kStartMs + 8000);
    archive::WriteSpan(folder_ / "1970-01-01/000010-5.span",
                       {kStartMs, kStartMs + 12'000, {"1970-01-01/000010-1.mkv", "1970-01-01/000018-4.mkv"}});
    bool is_begun = false;
    const ExportOptions announced{true, {}, {}, [&is_begun](std::int64_t) { is_begun = true; }};
    EXPECT_THROW(libav.Copy(folder_ / "1970-01-01/000010-5.span", null.Get(), announced), SourceError);
    EXPECT_FALSE(is_begun) << "two formats are found while an error can still be told";
    std::filesystem::rename(recording, folder_ / "elsewhere.mkv");
    std::filesystem::create_symlink(folder_ / "elsewhere.mkv", recording);
    EXPECT_THROW(libav.Copy(recording, null.Get(), {}), std::system_error) << "a link";
}

}  // namespace
}  // namespace lookhaven::test
