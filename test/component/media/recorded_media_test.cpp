// SPDX-License-Identifier: Apache-2.0
//
// Recordings as they are streamed: what ffmpeg decodes of it is what it decodes of the file; grown, damaged, in spans.
#include <algorithm>
#include <fstream>
#include <map>

#include <gtest/gtest.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/span_file.h"
#include "standalone/base/clock.h"
#include "standalone/media/recorded_media.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"

namespace lookhaven::test {
namespace {

using namespace media;
using Bytes = std::vector<std::uint8_t>;

constexpr std::int64_t kStartMs = 1'772'352'930'000;

struct Taken {
    std::vector<std::optional<int>> numbers;  // of the video frames
    std::vector<std::int64_t> times_ms;
    std::vector<std::int64_t> captured_ms;
    std::vector<Bytes> video, sound;
    std::vector<std::int64_t> sound_ms;

    // How often ffmpeg decodes a picture of which sum.
    static std::map<std::string, int> Pictures(const std::string& input) {
        std::istringstream lines(Shell("ffmpeg -v error " + input + " -map 0:v -f framemd5 - | grep -v '#'"));
        std::map<std::string, int> sums;
        for (std::string line; std::getline(lines, line);) {
            sums[line.substr(line.rfind(' ') + 1)]++;
        }
        return sums;
    }
    std::map<std::string, int> Decoded(const ArchiveFolder& folder, const std::string& format) const {
        const std::filesystem::path path = folder / "all.bin";
        std::ofstream file(path, std::ios::binary);
        for (const Bytes& frame : video) {
            file.write(reinterpret_cast<const char*>(frame.data()), static_cast<std::streamsize>(frame.size()));
        }
        file.close();
        return Pictures("-f " + format + " -i " + path.string());
    }
};

void TakeAll(RecordedMedia& media, Taken& taken) {
    while (const auto packet = media.Next()) {
        Bytes data(packet->data.begin(), packet->data.end());
        if (packet->medium == Medium::kAudio) {
            taken.sound.push_back(std::move(data));
            taken.sound_ms.push_back(packet->time_ms);
            EXPECT_FALSE(packet->number);
            continue;
        }
        if (data.empty()) {
            continue;
        }
        taken.video.push_back(std::move(data));
        taken.numbers.push_back(packet->number);
        taken.times_ms.push_back(packet->time_ms);
        taken.captured_ms.push_back(packet->captured_ms);
    }
}

Taken Take(const std::filesystem::path& path, int from = 0, bool with_sound = true) {
    const archive::RecordingReader recording(path);
    RecordedMedia media(recording, from, with_sound);
    Taken taken;
    TakeAll(media, taken);
    return taken;
}

// The clip's blocks of sound from a time on.
std::vector<Bytes> SoundOf(const Clip& clip, std::int64_t from_us = 0) {
    std::vector<Bytes> blocks;
    for (const OwnedPacket& packet : clip.packets) {
        if (packet.medium == Medium::kAudio && packet.time_us - clip.packets.front().time_us >= from_us) {
            blocks.push_back(packet.data);
        }
    }
    return blocks;
}

TEST(RecordedMedia, IsWhatWasRecorded) {
    const struct {
        const char *video, *audio, *format, *codecs;
    } rows[] = {
        {kH264, "-c:a aac -ar 16000", "h264", "H264;AAC"},
        {kH264Reordered, "-c:a pcm_alaw", "h264", "H264;PCMA"},
        {kH265, "-c:a libopus -ar 48000", "hevc", "H265;OPUS"},
        {kH264, "", "h264", "H264;"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(std::string(row.video) + row.audio);
        const Clip& clip = MakeClip(row.video, row.audio);
        const ArchiveFolder folder;
        const std::filesystem::path path = folder / "a.mkv";
        Record(clip, path, true, SIZE_MAX, kStartMs);
        const archive::RecordingReader recording(path);
        RecordedMedia media(recording, 0, true);
        EXPECT_EQ(media.VideoCodec() + ";" + media.AudioCodec(), row.codecs);
        EXPECT_EQ(Bytes(media.VideoExtra().begin(), media.VideoExtra().end()), clip.format.video.extra_data);
        if (media.AudioCodec() == "AAC") {
            EXPECT_EQ(Bytes(media.AudioExtra().begin(), media.AudioExtra().end()), clip.format.audio->extra_data);
        }
        Taken taken;
        TakeAll(media, taken);
        EXPECT_EQ(taken.Decoded(folder, row.format), Taken::Pictures("-i " + path.string()));
        ASSERT_EQ(taken.video.size(), 100U);
        for (std::size_t i = 0; i < taken.video.size(); ++i) {
            ASSERT_TRUE(taken.numbers[i]);
            EXPECT_EQ(taken.captured_ms[i], recording.CapturedMs(*taken.numbers[i]));
            EXPECT_EQ(taken.times_ms[i], recording.TimeOf(*taken.numbers[i]));
        }
        // What is interleaved behind the last frame has no frame that it belongs to.
        const std::vector<Bytes> sound = SoundOf(clip);
        ASSERT_LE(taken.sound.size(), sound.size());
        EXPECT_TRUE(std::equal(taken.sound.begin(), taken.sound.end(), sound.begin()));
        EXPECT_TRUE(std::ranges::is_sorted(taken.sound_ms));
        if (!sound.empty()) {
            EXPECT_NEAR(static_cast<double>(taken.sound_ms.back()), 4000, 200);
            EXPECT_TRUE(Take(path, 0, false).sound.empty());
        }
    }
}

TEST(RecordedMedia, BeginsWithTheKeyFrameThatAFrameIsMadeFrom) {
    const ArchiveFolder folder;
    Record(MakeClip(kH264Reordered, "-c:a pcm_alaw"), folder / "a.mkv");
    const struct { int from, key; } rows[] = {{0, 0}, {24, 0}, {25, 25}, {26, 25}, {99, 75}};
    for (const auto& [from, key] : rows) {
        const Taken taken = Take(folder / "a.mkv", from);
        ASSERT_FALSE(taken.numbers.empty());
        EXPECT_EQ(taken.numbers.front(), key) << from;
        EXPECT_TRUE(std::ranges::find(taken.numbers, std::optional(from)) != taken.numbers.end());
        EXPECT_EQ(taken.numbers.size(), static_cast<std::size_t>(100 - key)) << "closed groups of pictures";
        // Sound before it would be of pictures that are not shown.
        EXPECT_GE(taken.sound_ms.front() + 200, key * 40);
    }
}

TEST(RecordedMedia, FollowsARecordingThatGrows) {
    for (const char* video : {kH264, kH264Reordered}) {
        SCOPED_TRACE(video);
        const Clip& clip = MakeClip(video, "-c:a aac -ar 16000");
        const ArchiveFolder folder;
        Record(clip, folder / "whole.mkv");
        RecordingWriter writer(folder / "a.mkv", clip.format, base::WallMillis(), 1);
        for (std::size_t i = 0; i < 60; ++i) {
            writer.Write(clip.At(i));
        }
        writer.Flush();
        archive::RecordingReader recording(folder / "a.mkv");
        RecordedMedia media(recording, 0, true);
        Taken taken;
        for (std::size_t i = 60; i < clip.packets.size(); ++i) {
            writer.Write(clip.At(i));
            if (i % 7 == 0) {
                writer.Flush();
                recording.Refresh();
                const std::size_t before = taken.video.size();
                TakeAll(media, taken);
                EXPECT_TRUE(i < 80 || taken.video.size() > before) << "what is recorded comes while it grows";
            }
        }
        EXPECT_TRUE(recording.Grows());
        writer.Close();
        recording.Refresh();
        TakeAll(media, taken);
        const Taken whole = Take(folder / "whole.mkv");
        EXPECT_EQ(taken.video, whole.video);
        EXPECT_EQ(taken.numbers, whole.numbers);
        EXPECT_EQ(taken.sound, whole.sound);
    }
}

TEST(RecordedMedia, DamageCostsWhatItHits) {
    const Clip& clip = MakeClip(kH264, "-c:a aac -ar 16000");
    const ArchiveFolder source;
    Record(clip, source / "a.mkv");
    const std::vector<archive::FrameEntry> entries = Entries(source / "a.mkv");
    const Taken whole = Take(source / "a.mkv");
    const archive::FrameEntry& frame = entries[30];
    const std::uint64_t frame_end = frame.offset + frame.size;
    const struct {
        const char* what;
        std::uint64_t from, to;
        std::size_t frames;  // that come all the same
    } rows[] = {
        {"the length of a unit", frame.offset, frame.offset + 1, 80},  // and those up to the next key frame, 50
        {"what is between two frames", frame_end, entries[31].offset, 100},
        {"the head of a block", frame.offset - 4, frame.offset, 100},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.what);
        const ArchiveFolder folder;
        std::filesystem::copy(source.Path(), folder.Path());
        std::fstream file(folder / "a.mkv", std::ios::in | std::ios::out | std::ios::binary);
        file.seekp(static_cast<std::streamoff>(row.from));
        file << std::string(row.to - row.from, '\xFF');
        file.close();
        const Taken taken = Take(folder / "a.mkv");
        EXPECT_EQ(taken.video.size(), row.frames);
        EXPECT_EQ(taken.numbers.back(), 99);
        EXPECT_GE(taken.sound.size() + 3, whole.sound.size());
        EXPECT_LE(taken.sound.size(), whole.sound.size());
    }
    const archive::RecordingReader recording(source / "a.mkv");
    RecordedMedia media(recording, 0, true);
    std::filesystem::resize_file(source / "a.mkv", frame.offset);
    Taken taken;
    EXPECT_THROW(TakeAll(media, taken), archive::ArchiveError) << "cut while it is read";
    EXPECT_EQ(taken.video.size(), 30U);
    std::ofstream(source / "a.mkv") << std::string(100'000, 'x');
    EXPECT_THROW(Take(source / "a.mkv"), archive::ArchiveError) << "no head";
}

TEST(RecordedMedia, OfASpanWhatItIsMadeFrom) {
    const Clip& clip = MakeClip(kH264, "-c:a aac -ar 16000");
    const ArchiveFolder folder;
    const auto path = [&folder](int event, archive::FileKind kind) {
        return folder / archive::PathOf({1, kStartMs / 1000, event, kind});
    };
    archive::Span span{kStartMs + 3500, kStartMs + 6000, {}};
    for (const int event : {1, 2, 3}) {
        const std::filesystem::path file = path(event, archive::FileKind::kRecording);
        span.recordings.push_back(file.parent_path().filename() / file.filename());
        if (event != 2) {  // which retention has deleted
            Record(clip, file, true, SIZE_MAX, event == 1 ? kStartMs : kStartMs + 5000);
        }
    }
    const std::filesystem::path mark = path(4, archive::FileKind::kSpan);
    archive::WriteSpan(mark, span);
    const Taken taken = Take(mark);
    const archive::RecordingReader recording(mark);
    // From the key frame at 3 s to the last frame before 4 s, then from 5 s to 6 s.
    ASSERT_EQ(taken.video.size(), 50U);
    EXPECT_EQ(taken.captured_ms.front(), kStartMs + 3000);
    EXPECT_EQ(taken.captured_ms.back(), kStartMs + 5960);
    for (std::size_t i = 0; i < taken.video.size(); ++i) {
        const bool is_shown = taken.captured_ms[i] >= kStartMs + 3500;
        ASSERT_EQ(taken.numbers[i].has_value(), is_shown) << i;
        EXPECT_EQ(taken.times_ms[i], taken.captured_ms[i] - kStartMs - 3500);
        if (is_shown) {
            EXPECT_EQ(taken.captured_ms[i], recording.CapturedMs(*taken.numbers[i]));
        }
    }
    const auto shown = std::ranges::count_if(taken.numbers, [](const auto& number) { return number.has_value(); });
    ASSERT_GT(recording.FrameCount(), shown) << "a picture that stays for more than a second counts again";
    for (int from = 0; from < recording.FrameCount(); ++from) {
        const Taken begun = Take(mark, from);
        EXPECT_TRUE(std::ranges::find(begun.numbers, std::optional(from)) != begun.numbers.end()) << from;
    }
}

}  // namespace
}  // namespace lookhaven::test
