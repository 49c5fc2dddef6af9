// SPDX-License-Identifier: Apache-2.0
//
// Frames as cameras send them: parameter sets, pieces, sizes, and bytes that are no picture.
#include <ctime>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/media/annexb.h"
#include "standalone/media/frame_assembler.h"
#include "standalone/media/jpeg.h"
#include "standalone/media/source.h"
#include "standalone/media/still.h"
#include "test/support/camera/mjpeg_camera.h"

namespace lookhaven::test {
namespace {

using namespace media;

std::vector<std::uint8_t> Bytes(std::string_view text) {
    return {text.begin(), text.end()};
}
std::string Text(std::span<const std::uint8_t> bytes) {
    return {bytes.begin(), bytes.end()};
}

TEST(ParameterSets, StandBeforeEveryKeyFrame) {
    const std::string sps("\0\0\0\1\x67s", 6), pps("\0\0\0\1\x68p", 6), idr("\0\0\0\1\x65i", 6),
        aud("\0\0\1\x09\x10", 5);
    const std::string new_sps("\0\0\1\x67t", 5), vps265("\0\0\0\1\x40v", 6), sps265("\0\0\0\1\x42s", 6),
        pps265("\0\0\0\1\x44p", 6), idr265("\0\0\0\1\x26i", 6);
    ParameterSets h264(Codec::kH264, Bytes(sps + pps));
    EXPECT_EQ(Text(h264.Complete(Bytes(idr))), sps + pps + idr);
    EXPECT_EQ(Text(h264.Complete(Bytes(aud + new_sps + pps + idr))), aud + new_sps + pps + idr);
    EXPECT_EQ(Text(h264.Complete(Bytes(aud + idr))), std::string("\0", 1) + new_sps + pps + aud + idr)
        << "the new ones";
    EXPECT_EQ(Text(h264.Complete(Bytes(sps + idr))), std::string("\0", 1) + new_sps + pps + sps + idr) << "half a set";
    for (const std::string& set : {pps, sps + std::string(40'000, 'x')}) {
        std::string flood = sps + pps;  // each with a number of its own
        for (unsigned int i = 0; flood.size() < 1'000'000; ++i) {
            flood += set + std::to_string(i + 1'000'000);
        }
        const std::clock_t begin = std::clock();
        EXPECT_EQ(h264.Complete(Bytes(flood + idr)).size(), 12 + flood.size() + idr.size()) << "too large for sets";
        EXPECT_LT(std::clock() - begin, CLOCKS_PER_SEC);
    }
    ParameterSets h265(Codec::kH265, {});
    EXPECT_EQ(Text(h265.Complete(Bytes(idr265))), idr265);
    h265.Complete(Bytes(vps265 + sps265 + pps265 + idr265));
    EXPECT_EQ(Text(h265.Complete(Bytes(idr265))), vps265 + sps265 + pps265 + idr265);
}

TEST(FrameAssembler, PutsPiecesTogether) {
    // The rows are pieces of one stream of H.264 in their order, with their times.
    const std::string sets("\0\0\1\x67s\0\0\1\x68p", 10), idr("\0\0\1\x65\x88", 5), idr_2("\0\0\1\x65\x01", 5);
    const std::string picture("\0\0\0\1\x41\x9a", 6), picture_2("\0\0\1\x41\x01", 5), rest("\x9a\0\0\1\x41\xff", 6);
    struct Row {
        const char* name;
        std::string piece;
        std::int64_t time_us;
        std::string whole;
        std::int64_t whole_time_us = 0;  // 0: of its first piece
    };
    const Row rows[] = {
        {"rest of a picture", "\x9a\x41\xff", 60, ""},
        {"sets", sets, 100, ""},
        {"first slice", idr, 100, ""},
        {"sets again between the slices", sets, 100, ""},
        {"second slice", idr_2, 100, ""},
        {"next picture", picture, 140, sets + idr + sets + idr_2},
        {"fragment that looks like a start", rest, 140, ""},
        {"second slice, clock corrected", picture_2, 155, ""},
        {"two pictures of one time", picture, 140, ""},
        {"next picture", picture, 180, picture + rest + picture_2 + picture},
        {"too large", std::string(base::kMaxFrameBytes, 'x'), 180, ""},
        {"next picture", idr, 220, ""},
        {"sets of the next picture", sets, 260, idr},
        {"its slice, clock corrected", idr, 265, ""},
        {"next picture", picture, 300, sets + idr, 265},
    };
    FrameAssembler assembler(Codec::kH264);
    for (const Row& row : rows) {
        const auto frame = assembler.Add(Bytes(row.piece), row.time_us);
        EXPECT_TRUE((frame ? Text(frame->data) : "") == row.whole) << row.name;
        if (row.whole_time_us != 0) {
            EXPECT_EQ(frame ? frame->time_us : 0, row.whole_time_us) << row.name;
        }
    }
}

TEST(JpegSize, ReadsHeadersOfAnyKind) {
    const auto size_of = [](const std::string& bytes) {
        const std::optional<PictureSize> size = JpegSize(Bytes(bytes));
        return size ? std::to_string(size->width) + "x" + std::to_string(size->height) : "none";
    };
    const std::string frame = MjpegCamera::Frame(1);
    EXPECT_EQ(size_of(frame), "64x48");
    for (std::size_t length = 0; length < frame.size(); length += 13) {
        EXPECT_THAT(size_of(frame.substr(0, length)), testing::AnyOf("none", "64x48"));
    }
    EXPECT_EQ(size_of("\xff\xd8\xff\xff\xc2" + std::string("\0\x11\x08\0\x10\0\x20", 7)), "32x16")
        << "fill bytes, progressive";
    EXPECT_EQ(size_of(std::string("\xff\xd8\xff\xe0\0\0\xff\xe0\0\0\0\0\0\0", 14)), "none") << "segments of length 0";
    EXPECT_EQ(size_of("GIF89a and more"), "none");
    const std::pair<std::string, const char*> bounds[] = {
        {std::string("\x20\0\x20\0", 4), "8192x8192"}, {std::string("\x20\1\0\1", 4), "none"},
        {std::string("\0\1\x20\1", 4), "none"},        {std::string("\0\0\0\1", 4), "none"},
        {std::string("\0\1\0\0", 4), "none"},          {"\xff\xff\xff\xff", "none"}};
    for (const auto& [size, expected] : bounds) {
        EXPECT_EQ(size_of("\xff\xd8\xff\xc0" + std::string("\0\x11\x08", 3) + size), expected);
    }
}

TEST(Still, RefusesWhatIsNoPicture) {
    const std::vector<std::uint8_t> noise(1000, 0xa5);
    const std::vector<std::uint8_t> sets_only{0, 0, 0, 1, 0x67, 0x42, 0xc0, 0x0a, 0, 0, 0, 1, 0x68, 0xce};
    for (const Codec codec : {Codec::kH264, Codec::kH265}) {
        EXPECT_THROW(JpegOfKeyFrame(codec, noise), SourceError);
        EXPECT_THROW(JpegOfKeyFrame(codec, sets_only), SourceError);
    }
}

}  // namespace
}  // namespace lookhaven::test
