// SPDX-License-Identifier: Apache-2.0
//
// How one reader waits for an entry: for how long, and what ends a wait.
#include <atomic>
#include <csignal>
#include <thread>

#include <pthread.h>
#include <sys/resource.h>

#include "standalone/base/clock.h"
#include "test/component/ring/reading_fixture.h"
#include "test/support/wait.h"

namespace lookhaven::ring {
namespace {

using WaitingTest = ReadingTest;

TEST_F(WaitingTest, AWaitEndsWithItsTimeAndSleeps) {
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

TEST_F(WaitingTest, AFrameASoundAndASignalEndAWait) {
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

}  // namespace
}  // namespace lookhaven::ring
