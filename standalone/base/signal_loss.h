// SPDX-License-Identifier: Apache-2.0
//
// Why no picture comes from a camera, as far as its owner can do something about it.
#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <optional>
#include <string_view>

namespace lookhaven::base {

enum class SignalLoss : std::uint8_t {
    kOther,
    kRefused,        // nothing listens at its address and port
    kUnreachable,    // no route to its address, or no answer from it
    kUnknownHost,    // its host name cannot be resolved
    kWrongPassword,  // it does not accept the account and password
    kCertificate,    // its TLS certificate is not trusted
    kStalled,        // connected, but no picture came in time
};

constexpr std::array<std::string_view, 7> kSignalLossNames{
    "other", "refused", "unreachable", "unknown-host", "wrong-password", "certificate", "stalled"};

constexpr std::string_view NameOf(SignalLoss loss) {
    return kSignalLossNames.at(static_cast<std::size_t>(loss));
}

constexpr std::optional<SignalLoss> SignalLossOf(std::string_view name) {
    const auto* const found = std::ranges::find(kSignalLossNames, name);
    return found == kSignalLossNames.end() ? std::nullopt
                                           : std::optional(static_cast<SignalLoss>(found - kSignalLossNames.begin()));
}

}  // namespace lookhaven::base
