// SPDX-License-Identifier: Apache-2.0
//
// Admission without a privilege of the login session: the user's application privilege, and paired hosts with a cookie
// pair.
#pragma once

#include <string>

#include "platform/export.h"

class LH_PLATFORM_API SDKUser {
  public:
    // True when the user may use the application from the address.
    static bool AppPrivUserHas(const std::string& userName, const std::string& application,
                               const std::string& remoteIp);
};

// True when cookie is the right answer to timestamp under the secret that this host shares with a paired host. The
// module passes non-empty placeholders for missing values, which must not match.
LH_PLATFORM_API bool IsAuthPairMatch(const std::string& cookie, const std::string& timestamp);

// Pair matching on a recording server, for cross-site requests from its managing host.
class LH_PLATFORM_API SlaveHxAuthentication {
  public:
    SlaveHxAuthentication();
    // As IsAuthPairMatch, under the secret shared with the managing host.
    bool IsAuthByPairMatch(const std::string& cookie, const std::string& timestamp);
};
