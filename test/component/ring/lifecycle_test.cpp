// SPDX-License-Identifier: Apache-2.0
//
// How segments come, change hands and go: adoption, retirement, killed readers and writers, foreign segments, orphans.
#include <new>
#include <stdexcept>

#include <gmock/gmock.h>
#include <sys/shm.h>

#include "standalone/ring/segment_keys.h"
#include "test/component/ring/ring_fixture.h"

namespace lookhaven::ring {
namespace {

const StreamId kId{3, 0, Medium::kVideo};

class LifecycleTest : public RingTest {
  protected:
    static void Write(Writer& writer, int frames, std::size_t size_bytes = 4'000, bool is_key = true) {
        for (int i = 0; i < frames; ++i) {
            const auto data = MakeData(size_bytes, 42);
            if (!writer.Write({.data = data, .is_key = is_key})) {
                throw std::runtime_error("a frame was dropped");
            }
        }
    }
    // A child that has written three frames, and is killed when the test says so.
    KilledChild OtherRecorder(const StreamFormat& format = kMjpeg, const Geometry& geometry = kSmall) {
        return KilledChild([&] { Write(*new Writer(installation_, kId, format, geometry), 3); });
    }
    Writer MakeWriter(const StreamFormat& format = kMjpeg, const Geometry& geometry = kSmall) {
        return Writer(installation_, kId, format, geometry);
    }
};

TEST_F(LifecycleTest, ARestartedRecorderAdoptsTheRingUnderItsReaders) {
    KilledChild recorder = OtherRecorder();
    void* ring = Attach(installation_, kId);
    ASSERT_NE(ring, nullptr);
    Position position;
    StartRead(ring, &position);
    const Entry* held = ReadLatest(ring, kNoSequence, &position, 0);
    ASSERT_NE(held, nullptr);
    EXPECT_TRUE(HasFrameOfThisStart(ring));
    EXPECT_THROW(MakeWriter(), std::runtime_error) << "a living recorder keeps its ring";

    recorder.Kill();
    EXPECT_FALSE(IsWriterAlive(ring));
    EXPECT_FALSE(HasFrameOfThisStart(ring)) << "what a dead recorder left is old";
    {
        Writer writer = MakeWriter();
        EXPECT_TRUE(IsWriterAlive(ring));
        EXPECT_FALSE(HasFrameOfThisStart(ring));
        EXPECT_EQ(ReadLatest(ring), nullptr) << "nothing of the earlier run is shown as live";
        Write(writer, 100);
        EXPECT_TRUE(HasFrameOfThisStart(ring));
        EXPECT_TRUE(IsFilled(*held, 42));
        const Entry* entry = ReadNext(ring, held->sequence, &position);
        ASSERT_NE(entry, nullptr);
        EXPECT_EQ(entry->sequence, 102) << "the numbers go on";
        ReadFinish(ring, entry, &position);

        writer.StartRun();
        EXPECT_FALSE(HasFrameOfThisStart(ring)) << "what was captured before a reconnect is old too";
        EXPECT_EQ(ReadNext(ring, 102, &position), nullptr);
        EXPECT_FALSE(IsRetired(ring));
    }
    EXPECT_TRUE(IsRetired(ring)) << "after a clean stop";
    EXPECT_EQ(Attach(installation_, kId), nullptr);
    EXPECT_EQ(ReadLatest(ring, 102, &position), nullptr);
    Detach(ring);
}

TEST_F(LifecycleTest, WhatDoesNotMatchIsRetiredAndTheStreamMoves) {
    struct Row {
        const char* name;
        StreamFormat format;
        Geometry geometry;
        bool adopts;
    };
    for (const Row& row : {
             Row{"the same", kMjpeg, kSmall, true},
             Row{"a little more", kMjpeg, {64, kSmall.arena_bytes * 3 / 2}, true},
             Row{"grew under the earlier run", kMjpeg, {16, kSmall.arena_bytes / 4}, true},
             Row{"another codec", {"H264", {}, 1280, 720, true}, kSmall, false},
             Row{"another width", {"MJPEG", {}, 640, 720, true}, kSmall, false},
             Row{"other extra data", {"MJPEG", {1}, 1280, 720, true}, kSmall, false},
             Row{"too small", kMjpeg, {64, kSmall.arena_bytes * 4}, false},
             Row{"too few slots", kMjpeg, {256, kSmall.arena_bytes}, false},
         }) {
        SCOPED_TRACE(row.name);
        KilledChild recorder = OtherRecorder();
        void* ring = Attach(installation_, kId);
        recorder.Kill();
        const Writer writer = MakeWriter(row.format, row.geometry);
        EXPECT_EQ(IsRetired(ring), !row.adopts);
        void* now = Attach(installation_, kId);
        ASSERT_NE(now, nullptr);
        EXPECT_STREQ(Codec(now), row.format.codec.c_str());
        EXPECT_EQ(ListSegments(installation_).size(), 1U) << "a retired ring has no name";
        Detach(now);
        Detach(ring);
    }
}

TEST_F(LifecycleTest, ARingThatIsTooSmallMovesToALargerOneAndALaterReaderFindsIt) {
    Writer writer = MakeWriter(kH264);
    void* ring = Attach(installation_, kId);
    Write(writer, 1);
    writer.SetFormat(kH264);
    EXPECT_FALSE(IsRetired(ring)) << "the same format again is no change";
    Write(writer, 40, 4'000, false);  // pushes the key frame out
    EXPECT_FALSE(IsRetired(ring)) << "a new ring can begin with a key frame only";
    Write(writer, 1);
    EXPECT_TRUE(IsRetired(ring)) << "a ring must hold a group of pictures";
    EXPECT_EQ(writer.CurrentGeometry().arena_bytes, kSmall.arena_bytes * 2);
    Detach(ring);

    ring = Attach(installation_, kId);
    ASSERT_NE(ring, nullptr);
    const auto large = MakeData(100'000, 5);
    EXPECT_FALSE(writer.Write({.data = large, .is_key = false})) << "the larger ring begins with a key frame";
    EXPECT_TRUE(IsRetired(ring));
    EXPECT_TRUE(writer.Write({.data = large, .is_key = true}));
    Detach(ring);
    ring = Attach(installation_, kId);
    const Entry* entry = ReadLatest(ring);
    ASSERT_NE(entry, nullptr);
    EXPECT_TRUE(IsFilled(*entry, 5));
    StopRead(ring, nullptr);
    Detach(ring);
}

TEST_F(LifecycleTest, KilledReadersKeepNeitherSpaceNorSlots) {
    Writer writer = MakeWriter();
    void* ring = Attach(installation_, kId);
    Write(writer, 1);
    const auto pin_everything = [&](int readers) {
        std::vector<Position> positions(static_cast<std::size_t>(readers));
        for (Position& position : positions) {
            StartRead(ring, &position);
            if (ReadLatest(ring, kNoSequence, &position, 0) == nullptr) {
                throw std::runtime_error("no slot");
            }
        }
    };
    // Sixteen frames fill the arena; each has a reader of its own.
    const auto data = MakeData(4'000, 42);
    std::vector<std::unique_ptr<KilledChild>> readers;
    for (int i = 0; i < 16; ++i) {
        readers.push_back(std::make_unique<KilledChild>([&] { pin_everything(1); }));
        writer.Write({.data = data});
    }
    EXPECT_FALSE(writer.Write({.data = data})) << "living readers hold the whole arena";
    readers.clear();
    Write(writer, 100);

    KilledChild crowd([&] { pin_everything(static_cast<int>(kReaderSlots)); });
    Position position;
    StartRead(ring, &position);
    EXPECT_EQ(ReadLatest(ring, kNoSequence, &position, 0), nullptr) << "the table is full of living readers";
    StopRead(ring, &position);
    crowd.Kill();
    for (int i = 0; i < 2; ++i) {
        StartRead(ring, &position);
        const Entry* entry = ReadLatest(ring, kNoSequence, &position, 0);
        EXPECT_NE(entry, nullptr);
    }
    EXPECT_EQ(ListSegments(installation_)[0].attached, 2U) << "a killed process is detached";
    Detach(ring);
}

TEST_F(LifecycleTest, ForeignSegmentsAreRefusedAndReplaced) {
    struct Row {
        const char* name;
        void (*damage)(SegmentHead&);
        bool is_listed;
        bool is_replaced;
    };
    for (const Row& row : {
             Row{"another layout", [](SegmentHead& head) { head.constants.layout_version = 99; }, true, true},
             Row{"more bytes than there are", [](SegmentHead& head) { head.constants.segment_bytes += 4096; }, true,
                 true},
             Row{"an arena beyond the end", [](SegmentHead& head) { head.constants.arena_blocks += 1; }, true, true},
             Row{"an index beyond the end", [](SegmentHead& head) { head.constants.index_slots = 9'999; }, true, true},
             Row{"no index", [](SegmentHead& head) { head.constants.index_slots = 0; }, true, true},
             Row{"too long extra data", [](SegmentHead& head) { head.constants.extra_length = 1025; }, true, true},
             Row{"another's magic", [](SegmentHead& head) { head.magic = 1234; }, false, false},
             Row{"killed before the magic", [](SegmentHead& head) { head.magic = 0; }, false, true},
         }) {
        SCOPED_TRACE(row.name);
        OtherRecorder().Kill();
        const auto before = ListSegments(installation_);
        ASSERT_EQ(before.size(), 1U);
        row.damage(View(Attachment(before[0].shm_id).Address()).Head());
        EXPECT_EQ(Attach(installation_, kId), nullptr);
        const auto listed = ListSegments(installation_);
        EXPECT_EQ(listed.size(), row.is_listed ? 1U : 0U);
        EXPECT_TRUE(listed.empty() || !listed[0].has_known_layout);
        {
            Writer writer = MakeWriter();
            Write(writer, 1);
            void* ring = Attach(installation_, kId);
            EXPECT_NE(ring, nullptr);
            Detach(ring);
        }
        EXPECT_TRUE(ListSegments(installation_).empty());
        EXPECT_EQ(::shmctl(before[0].shm_id, IPC_RMID, nullptr) == 0, !row.is_replaced) << "not ours to remove";
    }
}

TEST_F(LifecycleTest, ADamagedRingIsReplacedAndItsViewersAreTold) {
    struct Row {
        const char* name;
        void (*damage)(const View&);
    };
    for (const Row& row : {
             Row{"another size", [](const View& view) { view.Head().constants.segment_bytes += 1; }},
             Row{"a newest count at the end of its range", [](const View& view) { view.Head().newest = ~0ULL; }},
             Row{"an index count at the end of its range", [](const View& view) { view.Slot(63).count = ~0ULL; }},
         }) {
        SCOPED_TRACE(row.name);
        KilledChild recorder = OtherRecorder();
        void* ring = Attach(installation_, kId);
        ASSERT_NE(ring, nullptr);
        recorder.Kill();
        row.damage(View(ring));
        Writer writer = MakeWriter();
        EXPECT_TRUE(IsRetired(ring));
        if (IsRetired(ring)) {
            Write(writer, 100);
        }
        Detach(ring);
    }
}

TEST_F(LifecycleTest, AnotherStreamsSegmentUnderTheSameKeyIsLeftAlone) {
    key_t key = 0;
    {
        const Writer writer = MakeWriter();
        shmid_ds status{};
        ASSERT_EQ(::shmctl(ListSegments(installation_)[0].shm_id, IPC_STAT, &status), 0);
        key = status.shm_perm.__key;
    }
    const int foreign = ::shmget(key, kSmallBytes, IPC_CREAT | IPC_EXCL | 0600);
    ASSERT_GE(foreign, 0);
    const Attachment attachment(foreign);
    auto& head = *new (attachment.Address()) SegmentHead{};
    head.constants.layout_version = kLayoutVersion;
    head.constants.camera = 99;
    head.magic = kMagic;
    Writer writer = MakeWriter();
    Write(writer, 3);
    void* ring = Attach(installation_, kId);
    ASSERT_NE(ring, nullptr);
    EXPECT_TRUE(HasFrameOfThisStart(ring));
    EXPECT_EQ(head.constants.camera, 99);
    Detach(ring);
    attachment.RemoveSegment();
}

TEST_F(LifecycleTest, OnlyOrphansAreRemoved) {
    const StreamId other{4, 0, Medium::kAudio};
    KilledChild recorder = OtherRecorder();
    const Writer living(installation_, other, {"AAC", {}, 0, 0, true}, kSmall);
    EXPECT_EQ(RemoveOrphans(installation_), 0U) << "both writers live";
    recorder.Kill();
    void* ring = Attach(installation_, kId);
    EXPECT_EQ(RemoveOrphans(installation_), 0U) << "a viewer waits for the next recorder";
    Detach(ring);
    EXPECT_EQ(RemoveOrphans(installation_), 1U);
    const auto left = ListSegments(installation_);
    ASSERT_EQ(left.size(), 1U);
    EXPECT_EQ(left[0].id, other);
    EXPECT_TRUE(left[0].writer_alive);
    EXPECT_EQ(left[0].attached, 1U);
    ring = Attach(installation_, other);
    RetireAll(installation_);
    EXPECT_TRUE(IsRetired(ring)) << "its viewer ends";
    EXPECT_TRUE(ListSegments(installation_).empty());
    Detach(ring);
}

}  // namespace
}  // namespace lookhaven::ring
