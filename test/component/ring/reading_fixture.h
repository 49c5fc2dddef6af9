// SPDX-License-Identifier: Apache-2.0
//
// One reader of a ring of video, and of the stream's sound where a test opens that, too.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

#include "test/component/ring/ring_fixture.h"

namespace lookhaven::ring {

inline const StreamId kVideo{7, 1, Medium::kVideo};
inline const StreamId kAudio{7, 1, Medium::kAudio};

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

}  // namespace lookhaven::ring
