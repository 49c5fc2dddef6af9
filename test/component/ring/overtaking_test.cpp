// SPDX-License-Identifier: Apache-2.0
//
// The writer overtakes a reader between its look at the index and its pin.
//
// Why so        That moment is a few instructions long. So the page with the reader's slot is made read-only in the
//               reader's attachment: storing the pin faults, and the fault's handler lets the writer overwrite the
//               whole ring through its own attachment before the store is done.
#include <csignal>
#include <functional>

#include <sys/mman.h>

#include "standalone/ring/segment.h"
#include "test/component/ring/ring_fixture.h"

namespace lookhaven::ring {
namespace {

std::function<void()> g_at_pin;

void OnFault(int) {
    g_at_pin();
}

TEST_F(RingTest, AReaderOvertakenWhileItPinsGetsAnEntryThatIsStillThere) {
    struct Row {
        const char* name;
        const Entry* (*read)(void* ring, Position* position);
    };
    for (const Row& row :
         {Row{"the newest", [](void*ring, Position*position) { return ReadLatest(ring, kNoSequence, position, 0); }},
          Row{"the next", [](void*ring, Position*position) { return ReadNext(ring, 0, position); }}}) {
        SCOPED_TRACE(row.name);
        Writer writer(installation_, {1, 0, Medium::kVideo}, {"MJPEG", {}, 0, 0, true},
                      {.index_slots = 8, .arena_bytes = 1 << 14});
        std::vector<std::vector<unsigned char>> frames;  // made beforehand: the fault's handler may not allocate
        for (std::uint64_t count = 1; count <= 152; ++count) {
            frames.push_back(MakeData(1'000, count));
        }
        std::size_t written = 0;
        const auto write = [&](int count) {
            for (; count > 0; --count) {
                writer.Write({.data = frames[written++]});
            }
        };
        void* ring = Attach(installation_, {1, 0, Medium::kVideo});
        Position position;
        StartRead(ring, &position);
        write(2);

        const auto slot = reinterpret_cast<std::uintptr_t>(&View(ring).Readers()[0]);
        const auto size = static_cast<std::uintptr_t>(::sysconf(_SC_PAGESIZE));
        void* page = reinterpret_cast<void*>(slot / size * size);
        ASSERT_EQ(position.reader, 0);
        struct sigaction before {};
        struct sigaction fault {};
        fault.sa_handler = OnFault;
        ::sigaction(SIGSEGV, &fault, &before);
        g_at_pin = [&] {
            write(100);
            ::mprotect(page, size, PROT_READ | PROT_WRITE);
        };
        ASSERT_EQ(::mprotect(page, size, PROT_READ), 0);
        const Entry* entry = row.read(ring, &position);
        ::sigaction(SIGSEGV, &before, nullptr);

        ASSERT_NE(entry, nullptr);
        EXPECT_EQ(entry->Count(), written);
        EXPECT_EQ(written, 102U) << "the reader stored no pin";
        write(50);
        EXPECT_EQ(entry->Count(), 102U) << "overwritten while it is held";
        EXPECT_TRUE(IsFilled(*entry, 102));
        ReadFinish(ring, entry, &position);
        Detach(ring);
    }
}

}  // namespace
}  // namespace lookhaven::ring
