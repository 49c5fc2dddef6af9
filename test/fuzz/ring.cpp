// SPDX-License-Identifier: Apache-2.0
//
// Changes any words of a ring, then reads it and lets a successor of its writer adopt it: no entry lies outside the
// segment.
#include "standalone/ring/reader.h"
#include "standalone/ring/writer.h"

#include <array>

#include <sys/shm.h>

#include "standalone/base/log.h"
#include "test/fuzz/fuzz.h"
#include "test/support/folder.h"

using namespace lookhaven;

namespace {

const ring::StreamId kStream{1, 0, ring::Medium::kVideo};
const ring::StreamFormat kFormat{"H264", {1, 2, 3}, 640, 480, false};
constexpr ring::Geometry kGeometry{4, 1 << 14};

void WriteFrames(ring::Writer& writer) {
    constexpr std::array<unsigned char, 100> kData{};
    for (const bool is_key : {true, false, true, false, false}) {
        writer.Write({.data = kData, .is_key = is_key});
    }
}

void Read(void* ring, std::size_t segment_bytes, fuzz::Input& input) {
    const auto check = [&](const ring::Entry* entry) {
        if (entry != nullptr) {
            const auto* begin = static_cast<const unsigned char*>(ring);
            fuzz::Require(entry->length > 0 && entry->offset >= 0 && entry->offset < entry->length);
            fuzz::Require(entry->Data() > begin && entry->Data() + entry->length <= begin + segment_bytes);
        }
    };
    ring::Position position;
    ring::StartRead(ring, &position);
    for (int i = 0; i < 4; ++i) {
        const auto sequence = input.Take<std::int16_t>();
        check(ring::ReadNext(ring, sequence, &position));
        check(ring::ReadLatest(ring, sequence, &position, 0));
        ring::ReadFinish(ring, nullptr, &position);
    }
    check(ring::ReadLatest(ring));
    check(ring::ReadLatestIFrame(ring));
    fuzz::Require(ring::ExtraData(ring).size() <= ring::kMaxExtraBytes && std::strlen(ring::Codec(ring)) < 32);
    ring::HasFrameOfThisStart(ring);
    ring::StopRead(ring, &position);
    ring::StopRead(ring, nullptr);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryFolder folder;
    static const base::Installation installation(folder);
    base::SetLogThreshold(base::Severity::kError);
    fuzz::Input input(data, size);
    ring::Writer writer(installation, kStream, kFormat, kGeometry);
    WriteFrames(writer);
    auto* words = static_cast<std::uint64_t*>(writer.Address());
    const std::size_t segment_bytes = ring::View(words).Constants().segment_bytes;
    for (int left = input.Take<std::uint8_t>(); left > 0; --left) {
        const std::size_t word = input.Take<std::uint16_t>() % (segment_bytes / sizeof(*words));
        words[word] = input.Take<std::uint64_t>();
    }
    if (void* ring = ring::Attach(installation, kStream)) {
        Read(ring, segment_bytes, input);
        ring::Detach(ring);
    }
    try {
        ring::Writer successor(installation, kStream, kFormat, kGeometry);
        WriteFrames(successor);
        Read(successor.Address(), successor.CurrentGeometry().arena_bytes + segment_bytes, input);
    } catch (const std::runtime_error&) {
        // the writer is alive
    }
    return 0;
}
