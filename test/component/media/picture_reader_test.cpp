// SPDX-License-Identifier: Apache-2.0
//
// Pictures of a recording by number: any order gives what presentation order gives, and what ffmpeg decodes.
#include <algorithm>
#include <fstream>
#include <numeric>
#include <random>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/media/jpeg.h"
#include "standalone/media/picture_reader.h"
#include "standalone/media/source.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"

namespace lookhaven::test {
namespace {

using namespace media;

using Picture = std::vector<std::uint8_t>;

Picture Read(PictureReader& reader, int index) {
    Picture picture(2 << 20);
    picture.resize(reader.Read(index, picture));
    return picture;
}

std::vector<Picture> ReadAll(const archive::RecordingReader& recording) {
    PictureReader reader(recording);
    std::vector<Picture> pictures(static_cast<std::size_t>(recording.FrameCount()));
    std::ranges::generate(pictures, [&, i = 0]() mutable { return Read(reader, i++); });
    return pictures;
}

TEST(PictureReader, AnyOrderGivesThePicturesThatFfmpegDecodes) {
    for (const char* options : {kMjpeg, kH264, kH264Reordered, kH265}) {
        SCOPED_TRACE(options);
        const ArchiveFolder folder;
        Record(MakeClip(options), folder / "a.mkv");
        const archive::RecordingReader recording(folder / "a.mkv");
        const std::vector<Picture> pictures = ReadAll(recording);
        ASSERT_EQ(pictures.size(), 100U);
        if (options == kMjpeg) {
            EXPECT_EQ(pictures, MakeClip(options).Frames());
        }
        std::ofstream all(folder / "all.mjpeg", std::ios::binary);
        for (const Picture& picture : pictures) {
            all.write(reinterpret_cast<const char*>(picture.data()), static_cast<std::streamsize>(picture.size()));
        }
        all.close();
        // The PSNR of the worst frame: a frame more or less, or wrong colours, is far below 30 dB.
        const std::string psnr =
            Shell("cd " + folder.Path().string() +
                  " && ffmpeg -v info -r 25 -i all.mjpeg -r 25 -i a.mkv -lavfi "
                  "'[0:v]format=rgb24[a];[1:v]format=rgb24[b];[a][b]psnr' -f null - 2>&1 | grep -o 'min:[0-9.inf]*'");
        ASSERT_THAT(psnr, testing::StartsWith("min:"));
        EXPECT_GT(std::stod(psnr.substr(4)), 30) << psnr;

        std::mt19937 random(5);
        PictureReader reader(recording);
        for (int i = 0; i < 150; ++i) {
            const int index = static_cast<int>(i < 30 ? 99 - static_cast<unsigned>(i) : random() % 100);
            ASSERT_EQ(Read(reader, index), pictures[static_cast<std::size_t>(index)]) << index << ", read " << i;
        }
    }
}

TEST(PictureReader, FollowsARecordingThatGrowsAndGoesOnWhenItIsDeleted) {
    const ArchiveFolder folder;
    const Clip& clip = MakeClip(kH264);
    Record(clip, folder / "whole.mkv");
    const std::vector<Picture> pictures = ReadAll(archive::RecordingReader(folder / "whole.mkv"));
    RecordingWriter writer(folder / "a.mkv", clip.format, 4'000'000'000'000, 1);
    archive::RecordingReader recording(folder / "a.mkv");
    PictureReader reader(recording);
    for (int i = 0; i < 100; ++i) {
        writer.Write(clip.At(static_cast<std::size_t>(i)));
        writer.Flush();
        recording.Refresh();
        ASSERT_EQ(recording.FrameCount(), i + 1);
        ASSERT_EQ(Read(reader, i), pictures[static_cast<std::size_t>(i)]) << i;
        if (i == 50) {
            std::filesystem::remove(folder / "a.mkv");
            std::filesystem::remove(folder / "a.index");
        }
    }
}

TEST(PictureReader, RefusesWhatDoesNotFitAndWhatIsGone) {
    for (const char* options : {kMjpeg, kH264}) {
        const ArchiveFolder folder;
        Record(MakeClip(options), folder / "a.mkv");
        const archive::RecordingReader recording(folder / "a.mkv");
        PictureReader reader(recording);
        std::vector<std::uint8_t> small(500);
        EXPECT_THROW(reader.Read(3, small), SourceError);
        const Picture fourth = Read(reader, 3);
        EXPECT_FALSE(fourth.empty());
        std::filesystem::resize_file(folder / "a.mkv", 2000);
        EXPECT_THROW(Read(reader, 90), archive::ArchiveError);
    }
}

// A camera's picture may be twice as large as what a player sends.
TEST(PictureReader, MakesPicturesOfMotionJpegThatDoNotFitSmaller) {
    const ArchiveFolder folder;
    Record(MakeClip(kMjpeg), folder / "a.mkv");
    const archive::RecordingReader recording(folder / "a.mkv");
    PictureReader reader(recording);
    const Picture whole = Read(reader, 3);
    for (const std::size_t divisor : {1U, 2U, 3U}) {
        Picture smaller(whole.size() / divisor);
        smaller.resize(reader.Read(3, smaller));
        const auto size = JpegSize(smaller);
        ASSERT_TRUE(size) << divisor;
        EXPECT_EQ(JpegSize(whole)->width % size->width, 0) << divisor;
        EXPECT_EQ(size->width == JpegSize(whole)->width, divisor == 1) << divisor;
    }
}

// In luma: of so few pixels, half as many in each direction have a colour.
TEST(SmallPictures, LookLikeTheWholeOnes) {
    for (const auto& [options, width, size] :
         {std::tuple(kMjpeg, 40, "40:30"), {kMjpeg, 50, "60:45"}, {kMjpeg, 1, "20:15"}, {kH264, 50, "50:38"}}) {
        SCOPED_TRACE(std::string(options) + size);
        const ArchiveFolder folder;
        Record(MakeClip(options), folder / "a.mkv");
        const archive::RecordingReader recording(folder / "a.mkv");
        PictureReader reader(recording);
        std::ofstream whole(folder / "whole.jpg", std::ios::binary);
        const Picture picture = Read(reader, 0);
        whole.write(reinterpret_cast<const char*>(picture.data()), std::ssize(picture));
        whole.close();
        Picture shrunk;
        if (options == kMjpeg) {
            shrunk = LoadDecoderLibrary().Shrink(picture, width);
        } else {
            const auto decoder = LoadDecoderLibrary().OpenDecoder("H264", 1);
            const archive::FrameEntry& entry = recording.Entries(0)[0];
            Picture frame(entry.size);
            recording.ReadBytes(0, entry, frame);
            decoder->Feed(frame, 0);
            decoder->Feed({}, 0);
            ASSERT_EQ(decoder->Take(), 0);
            shrunk.resize(1 << 20);
            shrunk.resize(decoder->Encode(shrunk, width));
        }
        std::ofstream(folder / "small.jpg", std::ios::binary)
            .write(reinterpret_cast<const char*>(shrunk.data()), std::ssize(shrunk));
        const std::string psnr = Shell("cd " + folder.Path().string() +
                                       " && ffmpeg -v info -i whole.jpg -i small.jpg -lavfi '[0:v]scale=" + size +
                                       ":flags=area,format=gray[a];[1:v]format=gray[b];[a][b]psnr' -f null - 2>&1 |"
                                       " grep -o 'average:[0-9.inf]*'");
        ASSERT_THAT(psnr, testing::StartsWith("average:")) << "of another size";
        EXPECT_GT(std::stod(psnr.substr(8)), 25) << psnr;
        EXPECT_THROW(LoadDecoderLibrary().Shrink(Picture{1, 2, 3}, width), SourceError);
    }
}

// Noise where frames were: pictures may look odd, but the reader lives and finds its way again at a key frame.
TEST(PictureReader, SurvivesDamagedFrames) {
    const ArchiveFolder folder;
    Record(MakeClip(kH264), folder / "a.mkv");
    const archive::RecordingReader recording(folder / "a.mkv");
    const std::vector<Picture> pictures = ReadAll(recording);
    std::string bytes = Contents(folder / "a.mkv");
    std::mt19937 random(11);
    for (std::uint32_t i = 25; i < 75; ++i) {
        const archive::FrameEntry& entry = recording.Entries(0)[i];
        std::generate_n(bytes.begin() + static_cast<std::ptrdiff_t>(entry.offset), entry.size,
                        [&] { return static_cast<char>(random()); });
    }
    std::fstream(folder / "a.mkv", std::ios::in | std::ios::out | std::ios::binary) << bytes;
    PictureReader reader(recording);
    for (int i = 0; i < 100; ++i) {
        try {
            const Picture picture = Read(reader, i);
            EXPECT_TRUE((i >= 25 && i < 75) || picture == pictures[static_cast<std::size_t>(i)]) << i;
        } catch (const SourceError&) {
            EXPECT_TRUE(i >= 25 && i < 75) << i;
        }
    }
}

}  // namespace
}  // namespace lookhaven::test
