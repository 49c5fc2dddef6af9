// SPDX-License-Identifier: Apache-2.0
//
// Writer and readers as processes that are killed at any instruction and started again.
#include <array>
#include <new>

#include <sys/mman.h>

#include "standalone/base/clock.h"
#include "test/component/ring/torture.h"

namespace lookhaven::ring {
namespace {

#ifdef __SANITIZE_THREAD__
constexpr std::uint64_t kFrames = 100'000;  // a race detector sees nothing between processes, and is slow
#else
constexpr std::uint64_t kFrames = 1'000'000;
#endif
constexpr std::int64_t kMaxRunMicros = 200'000'000;  // many times what it takes on idle cores
constexpr std::uint64_t kMaxFramesBetweenKills = 4'000;
constexpr int kMinKills = 100;
constexpr std::size_t kReaders = 4;
const StreamId kId{1, 0, Medium::kVideo};

// Writes until it is killed; now and then it ends the stream in order and begins another.
void RunWriter(const base::Installation& installation, std::uint64_t seed, Findings& findings) {
    std::mt19937_64 random(seed);
    for (;;) {
        Writer writer(installation, kId, {"H264", {}, 0, 0, false}, {.index_slots = 128, .arena_bytes = 1 << 18});
        const auto source = std::make_unique<TortureWriter>(writer, random(), findings);
        const bool ends_in_order = random() % 8 == 0;
        for (std::uint64_t left = ends_in_order ? random() % 100 : UINT64_MAX; left > 0; --left) {
            source->WriteBurst();
        }
    }
}

// Attaches, reads, and attaches anew when the ring is retired, until it is killed.
void RunReader(const base::Installation& installation, std::uint64_t seed, Findings& findings) {
    std::mt19937_64 random(seed);
    for (;;) {
        void* ring = Attach(installation, kId);
        if (ring == nullptr) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
            continue;
        }
        {
            TortureReader reader(ring, random(), findings);
            for (std::uint64_t reads = random() % 50'000; reads > 0 && !IsRetired(ring); --reads) {
                reader.ReadOnce();
            }
        }
        Detach(ring);
    }
}

using TortureTest = RingTest;

TEST_F(TortureTest, ProcessesKilledAtAnyInstructionTearNoFrameAndLeaveNothing) {
    std::mt19937_64 random(TortureSeed());
    void* memory = ::mmap(nullptr, sizeof(Findings), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    Findings& findings = *new (memory) Findings;
    std::array<pid_t, 1 + kReaders> processes{};
    const auto start = [&](std::size_t i) {
        const std::uint64_t seed = random();
        processes[i] = InChild([&, seed] {
            i == 0 ? RunWriter(installation_, seed, findings) : RunReader(installation_, seed, findings);
        });
    };
    for (std::size_t i = 0; i < processes.size(); ++i) {
        start(i);
    }
    const std::int64_t end = base::MonotonicMicros() + kMaxRunMicros;
    int kills = 0;
    int failed_children = 0;
    // The next kill comes after a number of frames, not after a time, so that processes get to work on a busy machine
    // too. More frames than that may pass during a sleep, so kills are counted as well.
    while ((findings.verified < kFrames || findings.laps < kMinLaps || kills < kMinKills) &&
           base::MonotonicMicros() < end) {
        const std::uint64_t next_kill = findings.verified + random() % kMaxFramesBetweenKills;
        while (findings.verified < next_kill && base::MonotonicMicros() < end) {
            std::this_thread::sleep_for(std::chrono::microseconds(random() % 1'000));
        }
        // The writer is killed as often as all readers together.
        const std::size_t victim = random() % 2 == 0 ? 0 : 1 + random() % kReaders;
        ::kill(processes[victim], SIGKILL);
        const int status = WaitFor(processes[victim]);
        failed_children += WIFEXITED(status) ? 1 : 0;
        ++kills;
        start(victim);
    }
    for (const pid_t process : processes) {
        test::KillAndWait(process);
    }
    std::cout << kills << " kills, ";
    findings.Expect(kFrames);
    EXPECT_EQ(failed_children, 0);
    EXPECT_GE(kills, kMinKills);
    RemoveOrphans(installation_);
    EXPECT_TRUE(ListSegments(installation_).empty());
    ::munmap(memory, sizeof(Findings));
}

}  // namespace
}  // namespace lookhaven::ring
