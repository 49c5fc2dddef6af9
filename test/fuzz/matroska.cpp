// SPDX-License-Identifier: Apache-2.0
//
// Feeds any bytes to the walker of Matroska files; the frames that it finds must lie in the file, in order.
#include "standalone/archive/matroska_blocks.h"

#include <sys/mman.h>

#include "standalone/base/video.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const base::FileDescriptor file(::memfd_create("fuzz", MFD_CLOEXEC));
    fuzz::Require(base::WriteAll(file.Get(), data, size));
    try {
        archive::MatroskaBlocks blocks(file.Get());
        std::vector<archive::FrameEntry> frames;
        for (std::uint64_t before = blocks.Position(); blocks.ReadCluster(frames); before = blocks.Position()) {
            fuzz::Require(blocks.Position() > before);
        }
        std::uint64_t end = 0;
        for (const archive::FrameEntry& frame : frames) {
            fuzz::Require(frame.offset >= end && frame.size > 0 && frame.size <= base::kMaxFrameBytes);
            end = frame.offset + frame.size;
        }
        fuzz::Require(end <= blocks.Position() && blocks.Position() <= size);
    } catch (const archive::ArchiveError&) {
    }
    return 0;
}
