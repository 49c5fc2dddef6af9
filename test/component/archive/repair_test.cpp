// SPDX-License-Identifier: Apache-2.0
//
// Recordings whose writer was killed, cut and damaged anywhere.
#include <algorithm>
#include <random>

#include <gtest/gtest.h>

#include "standalone/archive/repair.h"
#include "test/support/footage/archive_folder.h"
#include "test/support/footage/clips.h"

namespace lookhaven::test {
namespace {

TEST(CloseCrashed, SavesWhatIsWholeOfACutOrDamagedRecording) {
    const ArchiveFolder folder;
    const std::filesystem::path path = folder / "a.mkv";
    Record(MakeClip(kH264, "-c:a aac -ar 16000"), path, false);
    const std::string bytes = Contents(path);
    const std::string index = Contents(archive::IndexPathOf(path));
    const std::vector<archive::FrameEntry> frames = Entries(path);
    ASSERT_EQ(frames.size(), 100U);
    std::mt19937 random(3);
    for (int round = 0; round < 400; ++round) {
        std::string damaged = bytes;
        std::string damaged_index = index;
        const std::size_t place = round < 200 ? static_cast<std::size_t>(round) : random() % bytes.size();
        if (round % 2 == 0) {
            damaged.resize(place);
        } else {
            damaged[place] = static_cast<char>(damaged[place] ^ 1 << random() % 8);
        }
        damaged_index[random() % index.size()] ^= 64;
        Write(path, damaged);
        Write(archive::IndexPathOf(path), round % 3 == 0 ? damaged_index : index);
        if (round % 3 == 1) {
            std::filesystem::remove(archive::IndexPathOf(path));
        }
        const int saved = archive::CloseCrashed(path).frame_count;
        if (saved > 0) {
            const auto left = Entries(path);
            ASSERT_EQ(left.size(), static_cast<std::size_t>(saved));
            ASSERT_LE(left.size(), frames.size());
            ASSERT_LE(left.back().offset + left.back().size, std::filesystem::file_size(path));
        }
        if (round % 2 == 0) {
            ASSERT_EQ(saved, archive::CloseCrashed(path).frame_count) << "done twice it gives something else";
            const auto in_file = std::count_if(frames.begin(), frames.end(),
                                               [&](const auto& frame) { return frame.offset + frame.size <= place; });
            ASSERT_LE(saved, in_file);
            ASSERT_GE(saved, in_file - 20) << "more than the last cluster is gone";
        }
    }
    // A damaged cluster costs its own frames, up to the next key frame.
    std::string damaged = bytes;
    damaged.at(damaged.find("\x1f\x43\xb6\x75", bytes.size() / 2)) ^= 4;
    Write(path, damaged);
    std::filesystem::remove(archive::IndexPathOf(path));
    EXPECT_GE(archive::CloseCrashed(path).frame_count, 60);
    EXPECT_EQ(Entries(path).back(), frames.back());
    EXPECT_THROW(archive::CloseCrashed(folder / "none.mkv"), std::system_error);
}

}  // namespace
}  // namespace lookhaven::test
