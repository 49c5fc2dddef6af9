// SPDX-License-Identifier: Apache-2.0
//
// What a frame index that is damaged, cut, foreign or ahead of its recording gives: a clear refusal or its good frames.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "standalone/base/video.h"
#include "test/support/footage/archive_folder.h"

namespace lookhaven::test {
namespace {

using namespace archive;

constexpr std::size_t kHeadBytes = 64;
constexpr std::size_t kEntryBytes = 24;

// The entries, or nothing when the file was refused.
std::optional<std::vector<FrameEntry>> Read(const std::filesystem::path& path,
                                            std::uint64_t recording_bytes = 1 << 20) {
    try {
        std::vector<FrameEntry> entries;
        FrameIndexReader(path).ReadNew(recording_bytes, entries);
        return entries;
    } catch (const ArchiveError& error) {
        EXPECT_THAT(error.what(), testing::HasSubstr(path.filename().string()));
        return std::nullopt;
    }
}

class FrameIndex : public testing::Test {
  protected:
    FrameIndex() {
        MakeRecording(folder_ / "a.mkv", {0, 40, 120, 80, 160});
        bytes_ = Contents(path_);
        frames_ = FramesAt({0, 40, 120, 80, 160});
    }

    ArchiveFolder folder_;
    std::filesystem::path path_ = folder_ / "a.index";
    std::string bytes_;
    std::vector<FrameEntry> frames_;
};

TEST_F(FrameIndex, GivesWhatWasWrittenAlsoWithZerosBehindItAfterAPowerCut) {
    for (const int zeros : {0, 4096}) {
        Write(path_, bytes_ + std::string(zeros, '\0'));
        EXPECT_EQ(Read(path_), frames_);
        EXPECT_EQ(FrameIndexReader(path_).Header(), PlainHeader(1'000'000));
        EXPECT_TRUE(FrameIndexReader(path_).IsFinished());
    }
}

TEST_F(FrameIndex, CutAnywhereGivesItsWholeEntries) {
    for (std::size_t size = 0; size <= bytes_.size(); ++size) {
        Write(path_, bytes_.substr(0, size));
        const auto entries = Read(path_);
        ASSERT_EQ(entries.has_value(), size >= kHeadBytes) << size;
        if (entries) {
            ASSERT_THAT(*entries, testing::ElementsAreArray(frames_.data(), (size - kHeadBytes) / kEntryBytes));
        }
    }
}

TEST_F(FrameIndex, OneFlippedBitIsNeverTakenForAFrame) {
    for (std::size_t bit = 0; bit < 8 * bytes_.size(); ++bit) {
        std::string flipped = bytes_;
        flipped[bit / 8] = static_cast<char>(flipped[bit / 8] ^ 1 << bit % 8);
        Write(path_, flipped);
        const auto entries = Read(path_);
        // In the last entry it looks like one that is half written; in the mark of the end it changes no frame.
        const bool in_mark = bit == 8 * (kHeadBytes - 1);
        const bool in_last = bit / 8 >= bytes_.size() - kEntryBytes;
        ASSERT_EQ(entries.has_value(), in_mark || in_last) << "bit " << bit;
        if (entries) {
            ASSERT_THAT(*entries, testing::ElementsAreArray(frames_.data(), in_last ? 4 : 5)) << "bit " << bit;
        }
    }
}

TEST_F(FrameIndex, RefusesForeignFiles) {
    for (const std::string& bytes : {std::string("\x89PNG\r\n") + std::string(300, 'x'), std::string(5000, '\0'),
                                     std::string(kHeadBytes, '\xff'), bytes_.substr(kHeadBytes) + bytes_}) {
        Write(path_, bytes);
        EXPECT_EQ(Read(path_), std::nullopt);
    }
    EXPECT_THROW(FrameIndexReader{folder_.Path()}, std::system_error);
    EXPECT_THROW(FrameIndexReader{folder_ / "none.index"}, std::system_error);
}

TEST_F(FrameIndex, RefusesEntriesThatNoWriterMakes) {
    const FrameEntry good = frames_[0];
    const std::vector<std::vector<FrameEntry>> rows = {
        {{good.offset, good.size, 0, false}},                                            // begins without a key frame
        {good, {good.offset + 5, 10, 40, true}},                                         // overlaps the frame before
        {{good.offset, 0, 0, true}},                                                     // empty
        {{good.offset, base::kMaxFrameBytes + 1, 0, true}},                              // too large
        {{~std::uint64_t{0} - 5, 10, 0, true}},                                          // wraps round
        {good, {good.offset + 20, 10, (base::kMaxRecordingSeconds + 61) * 1000, true}},  // too late
    };
    for (const auto& row : rows) {
        std::filesystem::remove(path_);
        FrameIndexWriter(path_, PlainHeader(0)).Append(row);
        EXPECT_EQ(Read(path_), std::nullopt) << testing::PrintToString(&row - rows.data());
    }
}

TEST_F(FrameIndex, OffersOnlyFramesThatAreInTheRecording) {
    for (std::uint64_t size = 0; size < 220; ++size) {
        const auto inside = std::count_if(frames_.begin(), frames_.end(),
                                          [&](const FrameEntry& frame) { return frame.offset + frame.size <= size; });
        ASSERT_EQ(Read(path_, size)->size(), static_cast<std::size_t>(inside)) << size;
    }
}

TEST_F(FrameIndex, GrowsForAsLongAsItsWriterLives) {
    const std::filesystem::path path = folder_ / "b.index";
    std::optional<FrameIndexWriter> writer(std::in_place, path, PlainHeader(0));
    EXPECT_THROW(FrameIndexWriter(path, PlainHeader(0)), std::system_error);
    FrameIndexReader reader(path);
    EXPECT_TRUE(reader.IsGrowing());
    std::vector<FrameEntry> entries;
    for (std::size_t i = 0; i < frames_.size(); ++i) {
        writer->Append(std::span(frames_).subspan(i, 1));
        reader.ReadNew(1 << 20, entries);
        EXPECT_EQ(entries.size(), i + 1);
    }
    EXPECT_EQ(entries, frames_);
    writer.reset();  // as a kill would
    EXPECT_FALSE(reader.IsGrowing());
    EXPECT_FALSE(reader.IsFinished());
}

}  // namespace
}  // namespace lookhaven::test
