// SPDX-License-Identifier: Apache-2.0
//
// The recording servers that this host manages.
#pragma once

#include <map>
#include <string>

#include "platform/export.h"

// One recording server. A record is a value.
class LH_PLATFORM_API SlaveHx {
  public:
    SlaveHx() = default;
    SlaveHx(std::string ip, int port, std::string cookie);

    std::string GetIP() const;
    int GetPort() const;
    // A short-lived token with which a client may ask the server; never the secret that this host shares with it.
    std::string GetCookie() const;

  private:
    std::string m_Ip;
    int m_Port = 0;
    std::string m_Cookie;
};

class LH_PLATFORM_API SlaveHxMgr {
  public:
    // load: reads the servers now.
    explicit SlaveHxMgr(bool load);
    // The servers by id. Each flag narrows: to those that answer, that are enabled, that are of this host's own version.
    std::map<int, SlaveHx> GetSlaveHxMap(bool onlyOnline, bool onlyEnabled, bool onlySameVersion) const;

  private:
    std::map<int, SlaveHx> m_Servers;
};
