// SPDX-License-Identifier: Apache-2.0
//
// What tests of rings share: an installation of their own, and frames whose every byte is known.
#pragma once

#include <cstdint>
#include <cstring>
#include <span>
#include <vector>

#include <gtest/gtest.h>

#include "standalone/base/installation.h"
#include "standalone/ring/inventory.h"
#include "standalone/ring/reader.h"
#include "standalone/ring/writer.h"
#include "test/support/folder.h"
#include "test/support/process.h"

namespace lookhaven::ring {

using test::InChild;
using test::KilledChild;
using test::WaitFor;

const StreamFormat kMjpeg{"MJPEG", {}, 1280, 720, true};
const StreamFormat kH264{"H264", {1, 2, 3}, 1280, 720, false};
const Geometry kSmall{.index_slots = 64, .arena_bytes = 1 << 16};
const auto kSmallBytes = static_cast<std::size_t>(SegmentBytes(kSmall));

// An installation in a temporary folder; after the test it must have no segment left.
class RingTest : public testing::Test {
  protected:
    ~RingTest() override {
        RemoveOrphans(installation_);
        EXPECT_TRUE(ListSegments(installation_).empty()) << "a segment was left over";
    }

    test::TemporaryFolder home_;
    base::Installation installation_{(base::Installation::CreateFolders(home_), home_)};
};

// Fills data with words that follow from the seed and their offset.
inline void Fill(std::span<unsigned char> data, std::uint64_t seed) {
    for (std::size_t i = 0; i + 8 <= data.size(); i += 8) {
        const std::uint64_t word = (seed + i) * 0x9e3779b97f4a7c15ULL;
        std::memcpy(&data[i], &word, 8);
    }
}

inline std::vector<unsigned char> MakeData(std::size_t size_bytes, std::uint64_t seed) {
    std::vector<unsigned char> data(size_bytes);
    Fill(data, seed);
    return data;
}

// Every word of the entry's data is as Fill made it from the seed.
inline bool IsFilled(const Entry& entry, std::uint64_t seed) {
    for (std::size_t i = 0; i + 8 <= static_cast<std::size_t>(entry.length); i += 8) {
        std::uint64_t word = 0;
        std::memcpy(&word, entry.Data() + i, 8);
        if (word != (seed + i) * 0x9e3779b97f4a7c15ULL) {
            return false;
        }
    }
    return true;
}

}  // namespace lookhaven::ring
