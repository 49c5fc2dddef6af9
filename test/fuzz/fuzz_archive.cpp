// SPDX-License-Identifier: Apache-2.0
//
// Feeds any bytes to the walker of Matroska files and to the reader of frame indexes; what they offer must be usable.
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <system_error>

#include <sys/mman.h>
#include <unistd.h>

#include "standalone/archive/frame_index.h"
#include "standalone/archive/matroska_blocks.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/base/video.h"

using namespace lookhaven;

namespace {

base::FileDescriptor FileOf(const std::uint8_t* data, std::size_t size) {
    base::FileDescriptor file(::memfd_create("fuzz", MFD_CLOEXEC));
    if (::write(file.Get(), data, size) != static_cast<ssize_t>(size)) {
        std::abort();
    }
    return file;
}

void Require(bool condition) {
    if (!condition) {
        std::abort();
    }
}

void Check(const std::vector<archive::FrameEntry>& frames, std::uint64_t size) {
    std::uint64_t end = 0;
    for (const archive::FrameEntry& frame : frames) {
        Require(frame.offset >= end && frame.size > 0 && frame.size <= base::kMaxFrameBytes);
        end = frame.offset + frame.size;
    }
    Require(end <= size);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const base::FileDescriptor file = FileOf(data, size);
    try {
        archive::MatroskaBlocks blocks(file.Get());
        std::vector<archive::FrameEntry> frames;
        for (std::uint64_t before = blocks.Position(); blocks.ReadCluster(frames); before = blocks.Position()) {
            Require(blocks.Position() > before);
        }
        Require(blocks.Position() <= size);
        Check(frames, size);
    } catch (const archive::ArchiveError&) {
    }
    try {
        archive::FrameIndexReader index(base::FileDescriptor(::dup(file.Get())), "");
        std::vector<archive::FrameEntry> frames;
        index.ReadNew(1 << 20, frames);
        Check(frames, 1 << 20);
        Require(frames.empty() || frames.front().key);
    } catch (const archive::ArchiveError&) {
    }
    return 0;
}
