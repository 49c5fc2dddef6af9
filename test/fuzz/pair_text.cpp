// SPDX-License-Identifier: Apache-2.0
//
// Reads a host's offer to pair out of any text, and out of any JSON: an offer that was read can be written and read
// again.
#include "standalone/cli/pair_text.h"

#include "standalone/base/text.h"
#include "standalone/cli/console.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view bytes = fuzz::Text({data, size});
    for (const std::string& text : {std::string(bytes), "lookhaven-pair-1:" + base::ToBase64(bytes)}) {
        try {
            const std::string written = cli::ToText(cli::ParsePairText(text));
            fuzz::Require(cli::ToText(cli::ParsePairText(written)) == written);
        } catch (const cli::Failure& failure) {
            fuzz::Require(failure.Code() == cli::kDataError);
        }
    }
    return 0;
}
