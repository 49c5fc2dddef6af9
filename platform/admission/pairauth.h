// SPDX-License-Identifier: Apache-2.0
//
// Admission beside the login session: application privileges, and peers that present a cookie pair.
#pragma once

#include <string>

#include "platform/export.h"

class LH_PLATFORM_API SDKUser {
  public:
    // True when the user may use the application from the address.
    static bool AppPrivUserHas(const std::string& userName, const std::string& application,
                               const std::string& remoteIp);
};

// True when cookie answers timestamp under the secret that this host shares with a peer. Missing values arrive as
// placeholder texts and must not match.
LH_PLATFORM_API bool IsAuthPairMatch(const std::string& cookie, const std::string& timestamp);

// The pair matching of a recording server for requests that come across sites, from its managing host.
class LH_PLATFORM_API SlaveHxAuthentication {
  public:
    SlaveHxAuthentication();
    // As IsAuthPairMatch, under the secret shared with the managing host.
    bool IsAuthByPairMatch(const std::string& cookie, const std::string& timestamp);
};
