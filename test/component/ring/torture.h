// SPDX-License-Identifier: Apache-2.0
//
// A reader that checks each entry when it gets it and again before it releases it, and a writer to go with it.
#pragma once

#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <random>
#include <thread>

#include "test/component/ring/ring_fixture.h"

namespace lookhaven::ring {

constexpr std::uint64_t kMinLaps = 20;

// What all writers and readers of a run found; in shared memory where they are processes.
struct Findings {
    std::atomic<std::uint64_t> written{0};
    std::atomic<std::uint64_t> dropped{0};
    std::atomic<std::uint64_t> verified{0};
    std::atomic<std::uint64_t> torn{0};
    std::atomic<std::uint64_t> out_of_order{0};
    std::atomic<std::uint64_t> laps{0};         // what the reader would have read next had left the ring
    std::atomic<std::uint64_t> undecodable{0};  // it went on at a frame that builds on others

    void Expect(std::uint64_t min_verified) const {
        std::cout << written << " frames written, " << dropped << " dropped, " << verified << " verified, " << laps
                  << " laps\n";
        EXPECT_EQ(torn, 0U);
        EXPECT_EQ(out_of_order, 0U);
        EXPECT_GE(laps, kMinLaps);
        EXPECT_EQ(undecodable, 0U);
        EXPECT_GE(verified, min_verified);
        EXPECT_EQ(dropped, 0U) << "readers that are gone keep space";
    }
};

// The environment's LOOKHAVEN_TORTURE_SEED, to repeat a run, else a new one; printed.
inline std::uint64_t TortureSeed() {
    const char* given = std::getenv("LOOKHAVEN_TORTURE_SEED");
    const std::uint64_t seed = given != nullptr ? std::strtoull(given, nullptr, 10) : std::random_device{}();
    std::cout << "LOOKHAVEN_TORTURE_SEED=" << seed << '\n';
    return seed;
}

class TortureReader {
  public:
    TortureReader(void* ring, std::uint64_t seed, Findings& findings)
        : ring_(ring),
          random_(seed),
          findings_(findings),
          wants_every_frame_(random_() % 2 == 0) {
        StartRead(ring_, &position_);
    }
    ~TortureReader() { StopRead(ring_, &position_); }
    TortureReader(const TortureReader&) = delete;
    TortureReader& operator=(const TortureReader&) = delete;

    // One read of the kind that a live stream, a muxed stream or a snapshot does. A live stream waits a little.
    void ReadOnce() {
        if (random_() % 64 == 0) {
            const Entry* entry = random_() % 2 == 0 ? ReadLatest(ring_) : ReadLatestIFrame(ring_);
            Verify(entry);
            ReadFinish(ring_, entry, nullptr);
            return;
        }
        const Entry* entry = wants_every_frame_ ? ReadNext(ring_, last_, &position_) : nullptr;
        if (entry == nullptr) {
            entry = ReadLatest(ring_, last_, &position_, 5);
        } else if (entry->Count() != count_ + 1) {
            findings_.laps += count_ != 0 ? 1 : 0;
            findings_.undecodable += (entry->flags & kKeyFrame) == 0 ? 1 : 0;
        }
        if (entry != nullptr) {
            findings_.out_of_order += entry->Count() <= count_ ? 1 : 0;
            count_ = entry->Count();
            last_ = entry->sequence;
        }
        Verify(entry);
        ReadFinish(ring_, entry, &position_);
    }

  private:
    // The data follows from the timestamp, the number from the count.
    void Verify(const Entry* entry) {
        if (entry == nullptr) {
            return;
        }
        const auto seed = static_cast<std::uint64_t>(entry->TimestampMicros());
        const std::uint64_t count = entry->Count();
        bool whole = IsFilled(*entry, seed);
        if (random_() % 512 == 0) {
            std::this_thread::sleep_for(std::chrono::microseconds(random_() % 2'000));
        } else if (random_() % 128 == 0) {
            std::this_thread::yield();  // on a busy machine several milliseconds: not often
        }
        whole = whole && IsFilled(*entry, seed) && entry->Count() == count &&
                static_cast<std::uint64_t>(entry->sequence) == (count - 1) % 10'001;
        findings_.torn += whole ? 0 : 1;
        ++findings_.verified;
    }

    void* ring_;
    std::mt19937_64 random_;
    Findings& findings_;
    bool wants_every_frame_;
    Position position_;
    int last_ = kNoSequence;
    std::uint64_t count_ = 0;
};

// Writes frames of random size, every tenth a key frame, and counts them.
class TortureWriter {
  public:
    TortureWriter(Writer& writer, std::uint64_t seed, Findings& findings)
        : writer_(writer),
          random_(seed),
          findings_(findings) {}

    void WriteOnce(std::size_t max_bytes) {
        const std::uint64_t seed = random_();
        const std::span<unsigned char> data(buffer_, 8 + static_cast<std::size_t>(seed % (max_bytes - 8)));
        Fill(data, seed);
        const bool is_written = writer_.Write(
            {.data = data, .is_key = written_++ % 10 == 0, .timestamp_micros = static_cast<std::int64_t>(seed)});
        ++(is_written ? findings_.written : findings_.dropped);
    }

    // Writes at full speed, then pauses for the readers to catch up: a writer that never pauses leaves them no
    // processor on a busy machine.
    void WriteBurst() {
        for (std::uint64_t left = 1 + random_() % 256; left > 0; --left) {
            WriteOnce(random_() % 4 == 0 ? 3'000 : 500);
        }
        if (findings_.written > findings_.verified) {
            std::this_thread::sleep_for(std::chrono::microseconds(50));
        }
    }

  private:
    Writer& writer_;
    std::mt19937_64 random_;
    Findings& findings_;
    std::uint64_t written_ = 0;
    unsigned char buffer_[65'536];
};

}  // namespace lookhaven::ring
