// SPDX-License-Identifier: Apache-2.0
//
// A viewer so slow that the writer goes round it: what it gets can be decoded all the same.
#include <random>

#include "standalone/pattern/pattern_encoder.h"
#include "standalone/pattern/scene.h"
#include "standalone/ring/writer.h"
#include "test/component/recorder/recorder_fixture.h"

namespace lookhaven::test {
namespace {

constexpr int kWidth = 160;
constexpr int kHeight = 120;
constexpr int kGroup = 12;

// Real H.264 that may be repeated from the beginning without end.
std::vector<Seen> Film() {
    pattern::Scene scene(kWidth, kHeight, "Lapping");
    const auto encoder = pattern::MakePatternEncoder("h264", {.width = kWidth, .height = kHeight, .gop = kGroup});
    std::vector<Seen> film;
    for (std::int64_t number = 0; number < 20 * kGroup; ++number) {
        const pattern::EncodedPicture picture = encoder->Encode(scene.Draw(number, number * 40), number);
        film.push_back({{picture.data.begin(), picture.data.end()}, picture.key_frame, number * 40'000});
    }
    return film;
}

TEST_F(RecorderTest, WhateverASlowViewerTakesFromARingDecodes) {
    struct Row {
        const char* name;
        ring::Geometry geometry;
    };
    const std::vector<Seen> film = Film();
    int stream = 0;
    for (const Row& row : {Row{"entries run out first", {.index_slots = 32, .arena_bytes = 1 << 20}},
                           Row{"memory runs out first", {.index_slots = 4096, .arena_bytes = 1 << 15}}}) {
        SCOPED_TRACE(row.name);
        const ring::StreamId id{1, ++stream, base::Medium::kVideo};
        ring::Writer writer(*installation_, id, {"H264", {}, kWidth, kHeight, false}, row.geometry);
        ring::Position position;
        ring::StartRead(writer.Address(), &position);
        std::mt19937 random(7);
        std::size_t written = 0;
        std::uint64_t last_count = 0;
        int last_sequence = ring::kNoSequence;
        std::vector<Seen> taken;
        int laps = 0;
        const auto write = [&](std::size_t count) {
            for (; count > 0; --count) {
                const Seen& frame = film[written++ % film.size()];
                const std::span data(reinterpret_cast<const unsigned char*>(frame.data.data()), frame.data.size());
                ASSERT_TRUE(writer.Write({.data = data, .is_key = frame.key_frame}));
            }
        };
        write(1);
        while (taken.size() < 1'000 && !HasFailure()) {
            const ring::Entry* entry = ring::ReadNext(writer.Address(), last_sequence, &position);
            // While the viewer sends the entry, and while it is up to date, the camera goes on.
            write(random() % 16 == 0 ? random() % 400 : random() % 3);
            if (entry == nullptr) {
                continue;
            }
            const bool is_key = (entry->flags & ring::kKeyFrame) != 0;
            if (entry->Count() != last_count + 1) {
                ++laps;
                EXPECT_TRUE(is_key);
                EXPECT_GT(entry->Count(), last_count);
            }
            last_count = entry->Count();
            last_sequence = entry->sequence;
            taken.push_back({{reinterpret_cast<const char*>(entry->Data()), static_cast<std::size_t>(entry->length)},
                             is_key,
                             entry->TimestampMicros()});
            ring::ReadFinish(writer.Address(), entry, &position);
        }
        EXPECT_GE(laps, 20);
        EXPECT_EQ(Decoded("h264", {}, taken), taken.size());
    }
}

}  // namespace
}  // namespace lookhaven::test
