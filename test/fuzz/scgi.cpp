// SPDX-License-Identifier: Apache-2.0
//
// Feeds the SCGI parser any bytes, whole and cut in two: both ways must come to the same end.
#include "standalone/host/scgi.h"

#include "test/fuzz/fuzz.h"

using lookhaven::fuzz::Require;
using lookhaven::host::ScgiParser;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    lookhaven::fuzz::Input input(data, size);
    const std::size_t cut = input.Take<std::uint16_t>();
    const std::string_view bytes = lookhaven::fuzz::Text(input.Rest());
    ScgiParser whole;
    ScgiParser halves;
    const ScgiParser::State state = whole.Feed(bytes);
    halves.Feed(bytes.substr(0, cut));
    Require(halves.Feed(bytes.substr(std::min(cut, bytes.size()))) == state);
    Require(whole.Problem() == halves.Problem());
    if (state == ScgiParser::State::kComplete) {
        const auto one = whole.TakeRequest();
        const auto other = halves.TakeRequest();
        Require(one.headers == other.headers && one.body == other.body);
    }
    return 0;
}
