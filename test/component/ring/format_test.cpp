// SPDX-License-Identifier: Apache-2.0
//
// What a ring holds: the bounds of frames and formats, and how large it is made.
#include <gmock/gmock.h>
#include <sys/shm.h>

#include "test/component/ring/ring_fixture.h"

namespace lookhaven::ring {
namespace {

using FormatTest = RingTest;

TEST_F(FormatTest, FramesAndFormatsAreTakenWithinTheirBounds) {
    Writer writer(installation_, {7, 1, Medium::kVideo},
                  {std::string(40, 'c'), std::vector<unsigned char>(1025), 1, 2, true}, kSmall);
    EXPECT_EQ(std::string(Codec(writer.Address())), std::string(31, 'c'));
    EXPECT_TRUE(ExtraData(writer.Address()).empty());
    struct Row {
        std::size_t size_bytes;
        int offset;
        bool expected;
    };
    for (const Row& row : {Row{0, 0, false}, Row{1, 0, true}, Row{10, 9, true}, Row{10, 10, false}, Row{10, -1, false},
                           Row{4194303, 0, true}, Row{4194304, 0, false}}) {
        const auto data = MakeData(row.size_bytes, 1);
        EXPECT_EQ(writer.Write({.data = data, .offset = row.offset}), row.expected)
            << row.size_bytes << " bytes, offset " << row.offset;
    }
    const Entry* largest = ReadLatest(writer.Address());
    ASSERT_NE(largest, nullptr);
    EXPECT_TRUE(IsFilled(*largest, 1));
    StopRead(writer.Address(), nullptr);

    writer.SetFormat({"H264", std::vector<unsigned char>(1024, 9), 640, 360, false});
    EXPECT_THAT(ExtraData(writer.Address()), testing::AllOf(testing::SizeIs(1024), testing::Each(9)));
    EXPECT_EQ(Width(writer.Address()) * 1000 + Height(writer.Address()), 640'360);

    void* silence = AttachEmpty({7, 1, Medium::kAudio}, {"AAC", {7}, 0, 0, true});
    EXPECT_STREQ(Codec(silence), "AAC");
    Position position;
    StartRead(silence, &position);
    EXPECT_EQ(ReadNext(silence, kNoSequence, &position), nullptr);
    EXPECT_EQ(::shmdt(silence), 0);
}

TEST(Geometry, ARingHoldsAGroupOfPicturesOrThreeSecondsOfPictures) {
    struct Row {
        StreamEstimate estimate;
        std::uint64_t min_bytes;
        std::uint64_t max_bytes;
        std::uint32_t min_slots;
    };
    for (const Row& row : {
             Row{{Medium::kVideo, true, 200'000LL * 8 * 25, 200'000, 25}, 15'000'000, 34'000'000, 75},
             Row{{Medium::kVideo, false, 4'000'000, 200'000, 25}, 5'000'000, 17'000'000, 250},
             Row{{Medium::kVideo, false, 0, 0, 0}, 4'000'000, 17'000'000, 250},
             Row{{Medium::kVideo, false, 100'000, 4'000'000, 5}, 64'000'000, 135'000'000, 50},
             Row{{Medium::kAudio, true, 64'000, 0, 0}, 24'000, 140'000, 128},
             Row{{Medium::kVideo, true, std::int64_t{1} << 60, std::int64_t{1} << 60, 1e9}, 1 << 28, 1 << 28, 8'192},
         }) {
        const Geometry geometry = GeometryFor(row.estimate);
        EXPECT_GE(geometry.arena_bytes, row.min_bytes);
        EXPECT_LE(geometry.arena_bytes, row.max_bytes);
        EXPECT_GE(geometry.index_slots, row.min_slots);
        EXPECT_LE(geometry.index_slots, 8'192U);
    }
}

}  // namespace
}  // namespace lookhaven::ring
