// SPDX-License-Identifier: Apache-2.0
//
// Reads what says that a request was passed on: any text, a true token of which a byte is another, and any words that
// the key has signed. Only the token itself is taken.
#include "standalone/remote/forward_token.h"

#include "standalone/remote/token_code.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

namespace {

constexpr std::int64_t kNow = 1'700'000'000;

std::optional<std::string> ClientIn(std::string_view token) {
    static const std::string key(64, 'a');
    return remote::ClientInForwardToken(token, key, 2, kNow);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const std::string key(64, 'a');
    fuzz::Input input(data, size);
    const auto place = input.Take<std::uint8_t>();
    const char byte = input.Take<char>();
    const std::string said(fuzz::Text(input.Rest()));
    fuzz::Require(!ClientIn(said));

    const std::string token = remote::MakeForwardToken(key, 2, "192.0.2.7", kNow);
    std::string changed = token;
    changed[place % changed.size()] = byte;
    fuzz::Require(ClientIn(changed).has_value() == (changed == token));

    const std::string code = remote::TokenCode(key, "lookhaven forward 1\n2\n" + said);
    if (const auto client = ClientIn(said + code)) {
        fuzz::Require(said.find(*client) != said.npos);
    }
    return 0;
}
