// SPDX-License-Identifier: Apache-2.0
//
// Feeds any bytes to the reader of frame indexes; what it offers must lie in the recording, in order.
#include "standalone/archive/frame_index.h"

#include "standalone/base/video.h"
#include "test/fuzz/fuzz.h"
#include "test/support/folder.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryFolder folder;
    constexpr std::uint64_t kRecordingBytes = 1 << 20;
    std::vector<archive::FrameEntry> frames;
    fuzz::WriteFile(folder / "index", {data, size});
    try {
        archive::FrameIndexReader index(folder / "index");
        index.IsGrowing();
        index.ReadNew(kRecordingBytes, frames);
        const std::size_t read = frames.size();
        index.ReadNew(kRecordingBytes, frames);
        fuzz::Require(frames.size() == read);
    } catch (const archive::ArchiveError&) {
    }
    std::uint64_t end = 0;
    for (const archive::FrameEntry& frame : frames) {
        fuzz::Require(frame.offset >= end && frame.size > 0 && frame.size <= base::kMaxFrameBytes);
        end = frame.offset + frame.size;
    }
    fuzz::Require(end <= kRecordingBytes && (frames.empty() || frames.front().key));
    return 0;
}
