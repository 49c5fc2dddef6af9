// SPDX-License-Identifier: Apache-2.0
//
// What the shared library gives to fetch.cpp, which alone calls it.
#pragma once

#include "standalone/remote/fetch.h"

namespace lookhaven::remote {

struct Expected {
    std::span<const std::string_view> content_types;  // in lower case, without parameters
    std::chrono::seconds max_duration{};              // 0: endless
};

}  // namespace lookhaven::remote

// Returns whether the whole answer came; throws NoAnswer when none began.
extern "C" __attribute__((visibility("default"))) bool LookhavenFetch(const lookhaven::remote::Host& host,
                                                                      const lookhaven::remote::Request& request,
                                                                      const lookhaven::remote::Expected& expected,
                                                                      lookhaven::remote::Sink& sink);

// Appends to pem. Throws NoAnswer.
extern "C" __attribute__((visibility("default"))) void LookhavenFetchCertificates(const std::string& address, int port,
                                                                                  std::string& pem);
