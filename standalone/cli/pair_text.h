// SPDX-License-Identifier: Apache-2.0
//
// What a host gives to the one that is to show its cameras: one line of text, carried over by a person.
#pragma once

#include <string>
#include <vector>

#include <json/json.h>

#include "standalone/store/servers.h"

namespace lookhaven::cli {

struct PairOffer {
    std::string address;
    int port = 0;
    std::string certificate;  // PEM
    std::string secret;
    std::vector<store::RemoteCamera> cameras;  // server_id is 0
};

constexpr std::string_view kPairTextPrefix = "lookhaven-pair-1:";

std::string ToText(const PairOffer& offer);

// Throws Failure kDataError for any other text.
PairOffer ParsePairText(const std::string& text);

}  // namespace lookhaven::cli
