// SPDX-License-Identifier: Apache-2.0
//
// What one reader sees: the order of entries, where it continues after a gap, what stays while it sends.
#include <vector>

#include "test/component/ring/reading_fixture.h"

namespace lookhaven::ring {
namespace {

TEST_F(ReadingTest, NumbersRunToTenThousandAndBeginAgainWithoutAGapForTheReader) {
    Open(kVideo, kMjpeg, kSmall);
    int last = kNoSequence;
    for (int i = 0; i < 20'005; ++i) {
        ASSERT_TRUE(Write());
        const Entry* entry = ReadNext(ring_, last, &position_);
        ASSERT_NE(entry, nullptr) << i;
        ASSERT_EQ(entry->sequence, i % 10'001);
        ASSERT_EQ(entry->Count(), static_cast<std::uint64_t>(i) + 1);
        last = entry->sequence;
        ReadFinish(ring_, entry, &position_);
        ASSERT_EQ(ReadNext(ring_, last, &position_), nullptr);
        ASSERT_EQ(ReadLatest(ring_, last, &position_, 0), nullptr);
    }
    for (int i = 0; i < 10'001; ++i) {
        ASSERT_TRUE(Write());
    }
    EXPECT_EQ(Latest(last), written_) << "the same number after all numbers is another frame";
}

TEST_F(ReadingTest, ReadNextContinuesWhereTheStreamCanBeUnderstood) {
    struct Row {
        const char* name;
        const StreamId* id;
        const StreamFormat* format;
        const char* kinds;  // eight slots hold the last eight
        int last;
        std::uint64_t expected;
    };
    const StreamFormat audio{"AAC", {}, 0, 0, false};
    for (const Row& row : {
             Row{"nothing read: newest key frame", &kVideo, &kH264, "KppKpp", kNoSequence, 4},
             Row{"nothing read: newest of audio", &kAudio, &audio, "pppppp", kNoSequence, 6},
             Row{"nothing read: newest of MJPEG", &kVideo, &kMjpeg, "KKKKKK", kNoSequence, 6},
             Row{"in the ring: the one after", &kVideo, &kH264, "KppKpp", 1, 3},
             Row{"newest read: none", &kVideo, &kH264, "KppKpp", 5, 0},
             Row{"left the ring: newest key frame", &kVideo, &kH264, "KppKppKppKpp", 2, 10},
             Row{"left the ring: newest of audio", &kAudio, &audio, "pppppppppppp", 2, 12},
             Row{"left the ring, no key frame in it: none", &kVideo, &kH264, "Kppppppppppp", 1, 0},
             Row{"a number never given", &kVideo, &kH264, "KppKpp", 9000, 4},
             Row{"no number at all", &kVideo, &kH264, "KppKpp", -3, 4},
             Row{"empty", &kVideo, &kH264, "", kNoSequence, 0},
         }) {
        SCOPED_TRACE(row.name);
        Open(*row.id, *row.format, {.index_slots = 8, .arena_bytes = 1 << 16});
        WriteGroup(row.kinds);
        EXPECT_EQ(Next(row.last), row.expected);
        const Entry* without = ReadNext(ring_, row.last, nullptr);
        EXPECT_EQ(CountOf(without), row.expected) << "without a position";
        ReadFinish(ring_, without, nullptr);
        TearDown();
    }
    ring_ = nullptr;
}

TEST_F(ReadingTest, ASlowReaderGetsTheNewestFrameAndSkips) {
    Open(kVideo, kMjpeg, {.index_slots = 64, .arena_bytes = 1 << 20});
    ASSERT_TRUE(Write(30'000));
    const Entry* held = ReadLatest(ring_, kNoSequence, &position_, 0);
    ASSERT_NE(held, nullptr);
    for (int i = 0; i < 500; ++i) {
        ASSERT_TRUE(Write(20'000 + static_cast<std::size_t>(i) * 40)) << "the writer skips what is held";
        ASSERT_TRUE(IsFilled(*held, 1)) << "overwritten while it was sent, after " << i << " frames";
    }
    EXPECT_EQ(held->length, 30'000);
    ReadFinish(ring_, held, &position_);
    EXPECT_EQ(Latest(0), 501U);
}

TEST_F(ReadingTest, OnlyWhatReadersHoldCanLeaveNoSpaceAndOnlyForAsLong) {
    Open(kVideo, kH264, kSmall);
    std::vector<Position> positions(4);
    for (Position& position : positions) {
        ASSERT_TRUE(Write(14'000));
        StartRead(ring_, &position);
        ASSERT_NE(ReadLatest(ring_, kNoSequence, &position, 0), nullptr);
    }
    EXPECT_FALSE(Write(14'000));
    ReadFinish(ring_, nullptr, &positions[1]);
    EXPECT_FALSE(Write(14'000, false)) << "what follows a lost frame cannot be understood";
    EXPECT_TRUE(Write(14'000, true));
    EXPECT_EQ(writer_->DroppedFrames(), 2U);
    EXPECT_EQ(Latest(3), 5U) << "dropped frames take no number";
}

TEST_F(ReadingTest, EntriesWithoutAPositionAreHeldUntilTheyAreReleasedAndTakeNoSlotAfterwards) {
    Open(kVideo, kH264, kSmall);
    EXPECT_EQ(ReadLatest(ring_), nullptr);
    EXPECT_EQ(ReadLatestIFrame(ring_), nullptr);
    WriteGroup("KppKp");
    const Entry* newest = ReadLatest(ring_);
    const Entry* key = ReadLatestIFrame(ring_);
    EXPECT_EQ(ReadLatest(ring_), newest);
    ReadFinish(ring_, newest, nullptr);  // one of two reads
    EXPECT_EQ(CountOf(newest), 5U);
    EXPECT_EQ(CountOf(key), 4U);
    EXPECT_EQ(key->flags, kKeyFrame);
    EXPECT_EQ(newest->flags, 0U);
    EXPECT_EQ(newest->TimestampMicros(), 1);
    EXPECT_EQ(newest->CaptureMillis(), 2);
    for (int i = 0; i < 50; ++i) {
        ASSERT_TRUE(Write(9'000));
    }
    EXPECT_TRUE(IsFilled(*newest, 5) && IsFilled(*key, 4));
    EXPECT_EQ(ListSegments(installation_)[0].readers, 3U);
    ReadFinish(ring_, newest, nullptr);
    ReadIFrameFinish(ring_, key, nullptr);
    ReadFinish(ring_, nullptr, nullptr);
    ReadIFrameFinish(ring_, nullptr, nullptr);
    ASSERT_NE(ReadLatest(ring_), nullptr);
    StopRead(ring_, nullptr);
    StopRead(ring_, &position_);
    EXPECT_EQ(ListSegments(installation_)[0].readers, 0U);
    EXPECT_EQ(Latest(kNoSequence), 0U) << "a position that has stopped reads nothing";
}

TEST_F(ReadingTest, AForkedChildReadsNothingThroughItsParentsPositionAndLeavesItsPinAlone) {
    Open(kVideo, kMjpeg, kSmall);
    ASSERT_TRUE(Write(9'000));
    const Entry* held = ReadLatest(ring_, kNoSequence, &position_, 0);
    ASSERT_NE(held, nullptr);
    const int status = WaitFor(InChild([&] {
        const bool reads = ReadLatest(ring_, kNoSequence, &position_, 0) != nullptr;
        ReadFinish(ring_, nullptr, &position_);
        StopRead(ring_, &position_);
        ::_exit(reads ? 1 : 0);
    }));
    EXPECT_EQ(status, 0);
    for (int i = 0; i < 50; ++i) {
        ASSERT_TRUE(Write(9'000));
    }
    EXPECT_TRUE(IsFilled(*held, 1));
}

}  // namespace
}  // namespace lookhaven::ring
