// SPDX-License-Identifier: Apache-2.0
//
// The code by which two hosts are paired: how it is read, which typing errors it detects, which certificate it names.
#include "standalone/remote/pairing_code.h"

#include <string>

#include "test/component/store/store_fixture.h"

namespace lookhaven::remote {
namespace {

// As another implementation of the format writes it.
constexpr const char* kText = "008J-4CT4-ANK7-F24S-04HM-ASW9-NF6Y-Z93N";
const PairingCode kCode{"00112233445566778899", "0123456789abcdef"};

bool IsRefused(const std::string& text) {
    try {
        ParsePairingCode(text);
        return false;
    } catch (const InvalidPairingCode&) {
        return true;
    }
}

TEST(PairingCode, IsReadHoweverItIsTyped) {
    EXPECT_EQ(ToText(kCode), kText);
    for (const char* typed :
         {kText, "008J4CT4ANK7F24S04HMASW9NF6YZ93N", " oo8j 4ct4 ank7 f24s o4hm asw9 nf6y z93n\n"}) {
        EXPECT_EQ(ParsePairingCode(typed), kCode) << typed;
    }
    EXPECT_EQ(ParsePairingCode(ToText({std::string(20, '1'), std::string(16, 'f')})).secret, std::string(16, 'f'));
}

TEST(PairingCode, TellsEveryWrongDigitAndEveryTwoThatWereSwapped) {
    constexpr std::string_view kDigits = "0123456789ABCDEFGHJKMNPQRSTVWXYZ";
    const std::string text = kText;
    for (std::size_t at = 0; at < text.size(); ++at) {
        for (const char digit : kDigits) {
            std::string typed = text;
            typed[at] = text[at] == '-' ? '-' : digit;
            EXPECT_EQ(IsRefused(typed), typed != text) << typed;
        }
        std::string swapped = text;
        std::swap(swapped[at], swapped[(at + 1) % text.size()]);
        const bool is_same = text[at] == '-' || text[(at + 1) % text.size()] == '-' || swapped == text;
        EXPECT_EQ(IsRefused(swapped), !is_same) << swapped;
        EXPECT_EQ(IsRefused(text.substr(0, at) + text.substr(at + 1)), text[at] != '-') << "one is missing";
        EXPECT_TRUE(IsRefused(text.substr(0, at) + "U" + text.substr(at + 1)));
    }
    EXPECT_TRUE(IsRefused(text + "0"));
    EXPECT_TRUE(IsRefused(text + text));
    for (const std::string& bytes : store::kHostileTexts) {
        EXPECT_TRUE(IsRefused(bytes));
    }
}

TEST(PairingCode, NamesACertificateByTheFirstTenBytesOfItsFingerprint) {
    EXPECT_EQ(FingerprintPrefix({"CN=nvr", "8D:96:9E:EF:6E:CA:D3:C2:9A:3A:62:92", 0, true}), "8d969eef6ecad3c29a3a");
}

}  // namespace
}  // namespace lookhaven::remote
