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
    // A short-lived token for requests of a client to the server, never the secret that this host shares with it; empty
    // when the caller may not have one.
    std::string GetCookie() const;

  private:
    std::string m_Ip;
    int m_Port = 0;
    std::string m_Cookie;
};

class LH_PLATFORM_API SlaveHxMgr {
  public:
    // load: reads the servers now; otherwise there are none.
    explicit SlaveHxMgr(bool load);
    // The servers by id. Each flag leaves out servers: those that do not answer, that are disabled, that run another
    // version than this host.
    std::map<int, SlaveHx> GetSlaveHxMap(bool onlyOnline, bool onlyEnabled, bool onlySameVersion) const;

  private:
    std::map<int, SlaveHx> m_Servers;
};
