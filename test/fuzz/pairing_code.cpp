// SPDX-License-Identifier: Apache-2.0
//
// Reads the code that pairs two hosts out of any text: one that was read can be written and read again.
#include "standalone/remote/pairing_code.h"

#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text = fuzz::Text({data, size});
    try {
        const remote::PairingCode code = remote::ParsePairingCode(text);
        fuzz::Require(remote::ParsePairingCode(remote::ToText(code)) == code);
    } catch (const remote::InvalidPairingCode&) {
    }
    return 0;
}
