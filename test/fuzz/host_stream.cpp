// SPDX-License-Identifier: Apache-2.0
//
// A live stream of another host: what comes of it is within the limits of a packet, or refused.
#include "standalone/recorder/host_stream.h"
#include "standalone/base/clock.h"
#include "test/fuzz/fuzz.h"
#include "test/support/streaming_host.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    test::streamed = fuzz::Text({data, size});
    try {
        const auto source = recorder::OpenHostStream({1, "North", {}, std::string(64, '0'), 2}, {3, 0}, {}, {});
        for (;;) {
            const media::Packet packet = source->Next();
            fuzz::Require(!packet.data.empty() && packet.data.size() <= base::kMaxFrameBytes);
            fuzz::Require(packet.timestamp_us <= base::MonotonicMicros());
            fuzz::Require(base::IsVideo(packet.format->codec) == (packet.medium == base::Medium::kVideo));
            fuzz::Require(packet.format->width >= 0 && packet.format->width <= base::kMaxSidePixels);
        }
    } catch (const media::SourceError&) {
    }
    return 0;
}
