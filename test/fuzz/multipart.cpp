// SPDX-License-Identifier: Apache-2.0
//
// Feeds the reader of multipart answers any bytes, whole and in small pieces: both ways must give the same parts, none
// above the limit.
#include "standalone/media/multipart_reader.h"

#include "standalone/media/source.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

namespace {

constexpr std::size_t kMaxPartBytes = 1000;

std::vector<std::string> Parts(const std::string& boundary, fuzz::Input input, std::size_t piece_bytes) {
    std::vector<std::string> parts;
    media::MultipartReader reader(boundary, kMaxPartBytes, [&](std::span<std::uint8_t> buffer) {
        const std::span<const std::uint8_t> piece = input.Take(std::min(piece_bytes, buffer.size()));
        if (piece.empty()) {
            throw media::SourceError("ended");
        }
        std::ranges::copy(piece, buffer.begin());
        return piece.size();
    });
    try {
        for (;;) {
            parts.emplace_back(fuzz::Text(reader.Next()));
            fuzz::Require(parts.back().size() <= kMaxPartBytes);
        }
    } catch (const media::SourceError&) {
        return parts;
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::size_t piece_bytes = input.Take<std::uint8_t>() + 1U;
    const std::string boundary = media::BoundaryOf(input.TakeUntil("\n"));
    fuzz::Require(Parts(boundary, input, size) == Parts(boundary, input, piece_bytes));
    return 0;
}
