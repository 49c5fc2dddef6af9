// SPDX-License-Identifier: Apache-2.0
//
// Writer and readers as threads on one attachment, where a race detector can follow every byte.
#include <thread>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/ring/process_word.h"
#include "standalone/ring/reader_table.h"
#include "test/component/ring/torture.h"

namespace lookhaven::ring {
namespace {

constexpr std::int64_t kMinRunMicros = 4'000'000;
constexpr std::int64_t kMaxRunMicros = 90'000'000;  // many times what it takes on idle cores
constexpr std::uint64_t kMinVerified = 1'000;

// Readers that are gone: their slots name a process that is dead, and some still have a pin.
void LeaveDeadReaders(const View& view, std::mt19937_64& random) {
    ReaderTable table(view);
    const std::uint64_t dead = ProcessWord({.pid = 1, .start_ticks = std::uint64_t{1} << 40});
    if (ReaderSlot* slot = table.Own(table.Claim())) {
        const std::uint64_t newest = view.Head().newest.load();
        slot->pin.store(random() % 2 == 0 ? 0 : view.Slot(newest).region.load());
        slot->owner.store(dead);
    }
}

using TortureTest = RingTest;

TEST_F(TortureTest, ThreadsNeverSeeATornFrame) {
    const std::uint64_t seed = TortureSeed();
    Writer writer(installation_, {1, 0, Medium::kVideo}, {"H264", {}, 0, 0, false},
                  {.index_slots = 128, .arena_bytes = 1 << 18});
    Findings findings;
    std::atomic<bool> stop{false};
    std::vector<std::thread> threads;
    for (std::uint64_t i = 1; i <= 4; ++i) {
        threads.emplace_back([&, i] {
            std::mt19937_64 random(seed + i);
            while (!stop) {
                TortureReader reader(writer.Address(), random(), findings);
                for (std::uint64_t reads = random() % 200; reads > 0 && !stop; --reads) {
                    reader.ReadOnce();
                }
                LeaveDeadReaders(View(writer.Address()), random);
            }
        });
    }
    TortureWriter source(writer, seed, findings);
    const std::int64_t begin = base::MonotonicMicros();
    const auto has_enough = [&] { return findings.verified >= kMinVerified && findings.laps >= kMinLaps; };
    for (std::int64_t run = 0; run < kMinRunMicros || (!has_enough() && run < kMaxRunMicros);
         run = base::MonotonicMicros() - begin) {
        source.WriteOnce(6'000);
        if (findings.written % 16 == 0) {
            std::this_thread::yield();
        }
    }
    stop = true;
    for (std::thread& thread : threads) {
        thread.join();
    }
    findings.Expect(kMinVerified);
}

}  // namespace
}  // namespace lookhaven::ring
