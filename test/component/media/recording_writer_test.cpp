// SPDX-License-Identifier: Apache-2.0
//
// Recordings of every format, as ffprobe sees them; killed at any point, on a full disk, without an index.
#include <atomic>
#include <csignal>
#include <cstdio>
#include <random>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <unistd.h>

#include "standalone/archive/recording_reader.h"
#include "standalone/archive/repair.h"
#include "standalone/base/clock.h"
#include "test/support/failing_sync.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"
#include "test/support/process.h"

namespace lookhaven::test {
namespace {

using namespace media;

TEST(RecordingWriter, OtherProgramsReadEveryFormatAndALostIndexComesBack) {
    struct Row {
        const char* video;
        const char* audio;
        const char* probed;  // a pattern for ffprobe's lines
    };
    const Row rows[] = {
        {kMjpeg, "", "mjpeg,100\n"},
        {kMjpeg, "-c:a pcm_mulaw", "mjpeg,100\npcm_mulaw,[0-9]+\n"},
        {kH264, "-c:a aac -ar 16000", "h264,100\naac,6[0-9]\n"},
        {kH264Reordered, "-c:a pcm_alaw", "h264,100\npcm_alaw,[0-9]+\n"},
        {kH265, "-c:a libopus -ar 48000", "hevc,100\nopus,20[0-9]\n"},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(std::string(row.video) + row.audio);
        const ArchiveFolder folder;
        const std::filesystem::path path = folder / "a.mkv";
        Record(MakeClip(row.video, row.audio), path);
        EXPECT_THAT(Probe(path), testing::MatchesRegex(row.probed));
        EXPECT_EQ(Shell("ffprobe -v error -show_entries format_tags=creation_time -of csv=p=0 " + path.string()),
                  "2026-03-01T08:15:30.000000Z\n");
        const archive::RecordingReader recording(path);
        EXPECT_NEAR(recording.FrameRate(), 25, 0.1);
        EXPECT_FALSE(recording.Grows());
        const std::vector<archive::FrameEntry> written = Entries(path);
        std::filesystem::remove(archive::IndexPathOf(path));
        EXPECT_THROW(archive::RecordingReader{path}, std::system_error);
        const archive::Contents contents = archive::CloseCrashed(path);
        EXPECT_EQ(contents.frame_count, 100);
        EXPECT_EQ(contents.duration_ms, 4000);
        EXPECT_EQ(contents.header, recording.Header(0));
        EXPECT_EQ(Entries(path), written);
    }
}

// What a child process has passed to its writer, as the test sees it through shared memory.
struct Written {
    std::atomic<int> count{0};
    std::int64_t times_us[5000] = {};          // capture times
    std::atomic<std::int64_t> returned_us{0};  // when the last Write that has returned was called
};

void RecordUntilKilled(const Clip& clip, const std::filesystem::path& path, int length, Written& written) {
    RecordingWriter writer(path, clip.format, base::WallMillis(), 1);
    for (int i = 0; i < length; ++i) {
        Packet packet = clip.At(static_cast<std::size_t>(i) % clip.packets.size());
        packet.timestamp_us = base::MonotonicMicros();
        if (packet.medium == Medium::kVideo) {
            written.times_us[written.count] = packet.timestamp_us;
            written.count++;
        }
        writer.Write(packet);
        written.returned_us = packet.timestamp_us;
        std::this_thread::sleep_for(std::chrono::milliseconds(4));
    }
    writer.Close();
    ::pause();
}

// Whatever was captured half a second before a Write that returned is on the disk, however slow the machine is.
TEST(RecordingWriter, LosesHalfASecondAtMostWhenKilledAnywhere) {
    constexpr int kBatches = 4;
    constexpr int kAtOnce = 10;
    const Clip* clips[] = {&MakeClip(kMjpeg), &MakeClip(kH264, "-c:a aac -ar 16000")};
    const unsigned seed = std::random_device{}();
    std::printf("seed %u\n", seed);
    std::mt19937 random(seed);
    for (int batch = 0; batch < kBatches; ++batch) {
        const ArchiveFolder folder;
        auto* written =
            new (::mmap(nullptr, kAtOnce * sizeof(Written), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0))
                Written[kAtOnce];
        std::vector<std::pair<std::int64_t, std::pair<pid_t, int>>> kills;
        for (int i = 0; i < kAtOnce; ++i) {
            const int length = 30 + static_cast<int>(random() % 400);
            const pid_t pid = InChild(
                [&] { RecordUntilKilled(*clips[i % 2], folder / (std::to_string(i) + ".mkv"), length, written[i]); });
            kills.push_back(
                {base::MonotonicMicros() + 20'000 + static_cast<std::int64_t>(random() % 2'000'000), {pid, i}});
        }
        std::sort(kills.begin(), kills.end());
        for (const auto& [time_us, child] : kills) {
            std::this_thread::sleep_for(
                std::chrono::microseconds(std::max<std::int64_t>(0, time_us - base::MonotonicMicros())));
            ::kill(child.first, SIGKILL);
            ASSERT_TRUE(WIFSIGNALED(WaitFor(child.first))) << "the child failed by itself";
            const Written& seen = written[child.second];
            const auto old = std::count_if(seen.times_us, seen.times_us + seen.count,
                                           [&](std::int64_t us) { return us < seen.returned_us - 500'000; });
            const std::filesystem::path path = folder / (std::to_string(child.second) + ".mkv");
            const int frames = std::filesystem::exists(path) ? archive::CloseCrashed(path).frame_count : 0;
            ASSERT_GE(frames, old) << "of " << seen.count << " frames";
            if (frames > 0) {
                ASSERT_EQ(archive::RecordingReader(path).FrameCount(), frames);
                const char* codec = child.second % 2 == 0 ? "mjpeg," : "h264,";
                ASSERT_THAT(Probe(path), testing::AllOf(testing::StartsWith(codec + std::to_string(frames) + "\n"),
                                                        testing::Not(testing::HasSubstr("rror"))));
            }
        }
        ::munmap(written, kAtOnce * sizeof(Written));
    }
}

TEST(RecordingWriter, IsReadWhileItIsWritten) {
    const ArchiveFolder folder;
    const Clip& clip = MakeClip(kMjpeg);
    const auto frames = clip.Frames();
    RecordingWriter writer(folder / "a.mkv", clip.format, 4'000'000'000'000, 1);
    archive::RecordingReader recording(folder / "a.mkv");
    for (std::size_t i = 0; i < frames.size(); ++i) {
        writer.Write(clip.At(i));
        writer.Flush();
        recording.Refresh();
        ASSERT_TRUE(recording.Grows());
        ASSERT_EQ(recording.FrameCount(), static_cast<int>(i + 1));
        const archive::FrameEntry& entry = recording.Entries(0)[i];
        std::vector<std::uint8_t> bytes(entry.size);
        recording.ReadBytes(0, entry, bytes);
        ASSERT_EQ(bytes, frames[i]) << "a picture changed on its way";
    }
    EXPECT_THROW(archive::CloseCrashed(folder / "a.mkv"), std::system_error) << "a living writer's file";
    writer.Close();
    EXPECT_EQ(writer.FrameCount(), 100);
    EXPECT_EQ(writer.EndWallMs(), 4'000'000'004'000);
    EXPECT_EQ(writer.SizeBytes(),
              std::filesystem::file_size(folder / "a.mkv") + std::filesystem::file_size(folder / "a.index"));
}

TEST(RecordingWriter, AFullDiskLeavesWhatWasFlushed) {
    const ArchiveFolder folder;
    const Clip& clip = MakeClip(kMjpeg);
    struct rlimit before {};
    ::getrlimit(RLIMIT_FSIZE, &before);
    // A limit on the size of files, which refuses at any byte, stands for a disk that is full.
    const auto old_handler = std::signal(SIGXFSZ, SIG_IGN);
    for (const rlim_t limit : {30'001, 100'000, 123'457, 200'003}) {
        const std::filesystem::path path = folder / (std::to_string(limit) + ".mkv");
        RecordingWriter writer(path, clip.format, 0, 1);
        const struct rlimit small { limit, before.rlim_max };
        ::setrlimit(RLIMIT_FSIZE, &small);
        try {
            for (std::size_t i = 0; i < clip.packets.size(); ++i) {
                writer.Write(clip.At(i));
                writer.Flush();
            }
            ADD_FAILURE() << "nobody noticed";
        } catch (const WriteError& error) {
            EXPECT_EQ(error.code(), std::errc::file_too_large);
        }
        writer.Close();
        ::setrlimit(RLIMIT_FSIZE, &before);
        EXPECT_GT(writer.FrameCount(), 0);
        EXPECT_EQ(archive::RecordingReader(path).FrameCount(), writer.FrameCount());
        EXPECT_FALSE(archive::RecordingReader(path).Grows());
        EXPECT_EQ(Probe(path), "mjpeg," + std::to_string(writer.FrameCount()) + "\n");
    }
    // The disk is full when the file is ended, first with frames on it, then without any, and for a while away besides.
    for (const int flushed : {20, 0}) {
        const std::filesystem::path path = folder / "day/a.mkv";
        std::filesystem::create_directory(folder / "day");
        RecordingWriter writer(path, clip.format, 0, 1);
        for (int i = 0; i < flushed; ++i) {
            writer.Write(clip.At(static_cast<std::size_t>(i)));
        }
        writer.Flush();
        const struct rlimit small { std::filesystem::file_size(path) + 100, before.rlim_max };
        ::setrlimit(RLIMIT_FSIZE, &small);
        writer.Write(clip.At(static_cast<std::size_t>(flushed)));
        std::filesystem::rename(folder / "day", folder / "away");
        if (flushed == 0) {
            EXPECT_THROW(writer.Close(), WriteError) << "a file that is not there cannot be removed";
        }
        std::filesystem::rename(folder / "away", folder / "day");
        writer.Close();
        ::setrlimit(RLIMIT_FSIZE, &before);
        EXPECT_EQ(std::filesystem::exists(path), flushed > 0);
        EXPECT_EQ(std::filesystem::exists(archive::IndexPathOf(path)), flushed > 0);
        if (flushed > 0) {
            EXPECT_EQ(archive::RecordingReader(path).FrameCount(), flushed);
            EXPECT_FALSE(archive::RecordingReader(path).Grows());
        }
        std::filesystem::remove_all(folder / "day");
    }
    // It fills up before the first flush: the clusters that are on it whole are kept.
    const Clip& groups = MakeClip(kH264);
    Record(groups, folder / "whole.mkv", true);
    RecordingWriter writer(folder / "b.mkv", groups.format, 0, 1);
    const struct rlimit half { std::filesystem::file_size(folder / "whole.mkv") * 6 / 10, before.rlim_max };
    ::setrlimit(RLIMIT_FSIZE, &half);
    EXPECT_THROW(
        {
            for (std::size_t i = 0; i < groups.packets.size(); ++i) {
                writer.Write(groups.At(i));
            }
            writer.Flush();
        },
        WriteError);
    writer.Close();
    ::setrlimit(RLIMIT_FSIZE, &before);
    EXPECT_THAT(writer.FrameCount(), testing::AllOf(testing::Ge(25), testing::Le(75)));
    EXPECT_EQ(archive::RecordingReader(folder / "b.mkv").FrameCount(), writer.FrameCount());
    EXPECT_EQ(Probe(folder / "b.mkv"), "h264," + std::to_string(writer.FrameCount()) + "\n");
    std::signal(SIGXFSZ, old_handler);
    EXPECT_THROW(RecordingWriter(folder / "gone" / "a.mkv", clip.format, 0, 1), WriteError);
    EXPECT_FALSE(std::filesystem::exists(folder / "gone"));
}

// Whether they are on the disk nobody knows, though they can still be read from memory.
TEST(RecordingWriter, FramesOfAFailedSyncAreNeverIndexed) {
    const Clip& clip = MakeClip(kMjpeg);
    for (const int flushed : {20, 0}) {
        SCOPED_TRACE(flushed);
        const ArchiveFolder folder;
        const std::filesystem::path path = folder / "a.mkv";
        RecordingWriter writer(path, clip.format, 0, 1);
        for (int i = 0; i < flushed; ++i) {
            writer.Write(clip.At(static_cast<std::size_t>(i)));
        }
        writer.Flush();
        writer.Write(clip.At(static_cast<std::size_t>(flushed)));
        g_failing_syncs = 1;
        EXPECT_THROW(writer.Flush(), WriteError);
        ASSERT_EQ(g_failing_syncs, 0) << "nothing was synced";
        writer.Close();
        EXPECT_EQ(writer.FrameCount(), flushed);
        ASSERT_EQ(std::filesystem::exists(path), flushed > 0);
        if (flushed > 0) {
            EXPECT_EQ(archive::RecordingReader(path).FrameCount(), flushed);
            EXPECT_EQ(Probe(path), "mjpeg," + std::to_string(flushed) + "\n");
        }
    }
}

}  // namespace
}  // namespace lookhaven::test
