// SPDX-License-Identifier: Apache-2.0
//
// Feeds the SCGI parser any bytes, whole and cut in two: both ways must come to the same end.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "standalone/host/scgi.h"

using lookhaven::host::ScgiParser;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 2) {
        return 0;
    }
    const std::size_t cut = (std::size_t{data[0]} << 8 | data[1]) % size;
    const std::string_view bytes(reinterpret_cast<const char*>(data) + 2, size - 2);
    ScgiParser whole;
    ScgiParser halves;
    const ScgiParser::State state = whole.Feed(bytes);
    halves.Feed(bytes.substr(0, std::min(cut, bytes.size())));
    if (halves.Feed(bytes.substr(std::min(cut, bytes.size()))) != state) {
        std::abort();
    }
    if (state == ScgiParser::State::kComplete) {
        const auto one = whole.TakeRequest();
        const auto other = halves.TakeRequest();
        if (one.headers != other.headers || one.body != other.body) {
            std::abort();
        }
    }
    return 0;
}
