// SPDX-License-Identifier: Apache-2.0
//
// Puts frames together from any pieces of H.264 or H.265, and parameter sets in front of them: no byte may be lost, and
// the sets must be found again.
#include "standalone/media/annexb.h"
#include "standalone/media/frame_assembler.h"

#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const media::Codec codec = input.Take<std::uint8_t>() % 2 == 0 ? media::Codec::kH264 : media::Codec::kH265;
    media::FrameAssembler assembler(codec);
    media::ParameterSets sets(codec, {});
    std::string sent;
    std::string received;
    for (std::int64_t time_us = 1; !input.IsEmpty();) {
        time_us += input.Take<std::uint8_t>();
        const std::span<const std::uint8_t> piece = input.Take(input.Take<std::uint16_t>());
        const auto frame = assembler.Add(piece, time_us);
        if (frame) {
            received += fuzz::Text(frame->data);
            fuzz::Require(received == sent);
            const bool is_key = media::IsKeyFrame(codec, frame->data);
            const std::span<const std::uint8_t> completed = sets.Complete(frame->data);
            fuzz::Require(media::IsKeyFrame(codec, completed) == is_key);
            fuzz::Require(fuzz::Text(completed).ends_with(fuzz::Text(frame->data)));
            fuzz::Require(media::ParameterSets(codec, sets.Current()).Current() == sets.Current());
        }
        sent += fuzz::Text(piece);
    }
    return 0;
}
