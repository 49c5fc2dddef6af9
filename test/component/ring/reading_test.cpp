// SPDX-License-Identifier: Apache-2.0
//
// What one reader sees: the order of entries, where it continues after a gap, how it waits, what stays while it sends.
#include <atomic>
#include <csignal>
#include <optional>
#include <thread>

#include <gmock/gmock.h>
#include <pthread.h>
#include <sys/resource.h>
#include <sys/shm.h>

#include "standalone/base/clock.h"
#include "test/component/ring/ring_fixture.h"
#include "test/support/wait.h"

namespace lookhaven::ring {
namespace {

const StreamId kVideo{7, 1, Medium::kVideo};
const StreamId kAudio{7, 1, Medium::kAudio};

class ReadingTest : public RingTest {
  protected:
    void Open(const StreamId& id, const StreamFormat& format, const Geometry& geometry) {
        writer_.emplace(installation_, id, format, geometry);
        ring_ = Attach(installation_, id);
        ASSERT_NE(ring_, nullptr);
        StartRead(ring_, &position_);
    }
    // Opens the stream's other ring, too, which reads of the first one wait for.
    void OpenSound() {
        sound_writer_.emplace(installation_, kAudio, StreamFormat{"AAC", {}, 0, 0, true}, kSmall);
        sound_ = {Attach(installation_, kAudio), &sound_position_};
        StartRead(sound_.ring, &sound_position_);
    }
    void WriteSound() { sound_writer_->Write({.data = MakeData(64, 1)}); }
    void TearDown() override {
        Detach(ring_);
        Detach(sound_.ring);
        writer_.reset();
        sound_writer_.reset();
    }

    // The frame's data follows from its count.
    bool Write(std::size_t size_bytes = 64, bool is_key = true) {
        const auto data = MakeData(size_bytes, written_ + 1);
        const bool done = writer_->Write({.data = data, .is_key = is_key, .timestamp_micros = 1, .capture_millis = 2});
        written_ += done ? 1 : 0;
        return done;
    }
    // Writes key and other frames as the letters say: K, p.
    void WriteGroup(std::string_view kinds) {
        for (const char kind : kinds) {
            ASSERT_TRUE(Write(64, kind == 'K'));
        }
    }
    static std::uint64_t CountOf(const Entry* entry) { return entry == nullptr ? 0 : entry->Count(); }
    // Reads and releases at once.
    std::uint64_t Next(int last) { return Released(ReadNext(ring_, last, &position_)); }
    std::uint64_t Latest(int last) { return Released(ReadLatest(ring_, last, &position_, 0)); }
    std::uint64_t Released(const Entry* entry) {
        const std::uint64_t count = CountOf(entry);
        ReadFinish(ring_, entry, &position_);
        return count;
    }

    std::optional<Writer> writer_;
    void* ring_ = nullptr;
    Position position_;
    std::optional<Writer> sound_writer_;
    Position sound_position_;
    SecondReader sound_;
    std::uint64_t written_ = 0;
};

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

TEST_F(ReadingTest, AWaitEndsWithItsTimeAndSleeps) {
    Open(kVideo, kMjpeg, kSmall);
    OpenSound();
    ASSERT_TRUE(Write());
    enum Read { kLatest, kNext, kNextOfSilent, kNextBesideUnreadSound };
    struct Row {
        const char* name;
        Read read;
        int wait_ms;
        int min_ms;
        int sleeps;
    };
    // Far above what a busy machine adds, far below what a wait of the whole time or without an end would take.
    constexpr int kMaxMs = 30'000;
    for (const Row& row :
         {Row{"time", kLatest, 60, 60, 1}, Row{"longest time", kLatest, 120'000, 100, 1},
          Row{"no wait", kLatest, 0, 0, 0}, Row{"of both rings", kNext, 60, 60, 1},
          Row{"of a silent stream", kNextOfSilent, 60, 60, 1},
          Row{"of both rings, longest time", kNext, 120'000, 100, 1}, Row{"no wait of both rings", kNext, 0, 0, 0},
          Row{"sound goes first", kNextBesideUnreadSound, 120'000, 0, 0}}) {
        SCOPED_TRACE(row.name);
        rusage before{};
        ::getrusage(RUSAGE_THREAD, &before);
        const std::int64_t begin = base::MonotonicMicros();
        if (row.read == kNextBesideUnreadSound) {
            WriteSound();
        }
        const SecondReader sound = row.read == kNextOfSilent ? SecondReader{} : sound_;
        EXPECT_EQ(row.read == kLatest ? ReadLatest(ring_, 0, &position_, row.wait_ms)
                                      : ReadNext(ring_, 0, &position_, sound, row.wait_ms),
                  nullptr);
        const std::int64_t took_ms = (base::MonotonicMicros() - begin) / 1000;
        rusage after{};
        ::getrusage(RUSAGE_THREAD, &after);
        EXPECT_GE(took_ms, row.min_ms);
        EXPECT_LT(took_ms, kMaxMs);
        EXPECT_GE(after.ru_nvcsw - before.ru_nvcsw, row.sleeps) << "it spins";
        EXPECT_LE(after.ru_nvcsw - before.ru_nvcsw, row.sleeps + 5) << "it polls";
    }
}

TEST_F(ReadingTest, AFrameASoundAndASignalEndAWait) {
    Open(kVideo, kMjpeg, kSmall);
    OpenSound();
    ASSERT_TRUE(Write());
    static std::atomic<int> signals{0};
    struct sigaction interrupt {};
    interrupt.sa_handler = [](int) { ++signals; };
    ::sigaction(SIGUSR1, &interrupt, nullptr);
    // A wait may time out before the test sees it: the frame then ends a later one, the signal none.
    int interrupted = 0;
    for (int round = 0; round < 40 || interrupted < 2; ++round) {
        const bool by_frame = round % 2 == 0;
        const bool of_both = round % 4 >= 2;
        const bool by_sound = by_frame && of_both && round % 8 >= 4;
        const SecondReader sound = round % 16 / 2 == 1 ? SecondReader{} : sound_;
        const int last = static_cast<int>(written_) - 1;
        std::atomic<pid_t> thread{0};
        std::atomic<bool> is_done{false};
        signals = 0;
        std::thread reader([&] {
            thread = ::gettid();
            const Entry* entry = nullptr;
            do {
                entry = of_both ? ReadNext(ring_, last, &position_, sound) : ReadLatest(ring_, last, &position_);
                if (by_sound && entry == nullptr) {
                    entry =
                        ReadNext(sound_.ring,
                                 sound_position_.count == 0 ? kNoSequence : static_cast<int>(sound_position_.count) - 1,
                                 &sound_position_);
                }
            } while (by_frame && entry == nullptr);
            is_done = true;
            EXPECT_EQ(entry != nullptr, by_frame);
            ReadFinish(ring_, entry, &position_);
            ReadFinish(sound_.ring, entry, &sound_position_);
        });
        const auto sleeps = [&] { return thread != 0 && test::IsAsleep(thread) && !is_done; };
        if (by_frame) {
            EXPECT_TRUE(test::Eventually(sleeps));
            by_sound ? WriteSound() : void(Write());
            EXPECT_FALSE(sleeps()) << "the frame does not wake it";
        }
        while (!is_done) {
            if (!by_frame && sleeps()) {
                ::pthread_kill(reader.native_handle(), SIGUSR1);
            }
        }
        reader.join();
        EXPECT_LE(signals, 1) << "it goes on sleeping after a signal";
        interrupted += signals;
    }
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
