// SPDX-License-Identifier: Apache-2.0
//
// Any bytes as a log file: what is told of it is text of bounded length, in one line, and no password of an address.
#include "standalone/doctor/error_log.h"

#include "standalone/base/text.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view log = fuzz::Text({data, size});
    for (const doctor::LoggedError& error : doctor::ErrorsIn(log)) {
        for (std::string_view text : {std::string_view(error.process), std::string_view(error.text)}) {
            fuzz::Require(text.size() <= doctor::kMaxTextBytes && text.find("://a:secret@") == text.npos);
            while (!text.empty()) {
                const std::optional<char32_t> character = base::TakeCharacter(text);
                fuzz::Require(character && *character >= 0x20 && *character != 0x7f);
            }
        }
    }
    return 0;
}
