// SPDX-License-Identifier: Apache-2.0
//
// Search for recorded events of several cameras.
#pragma once

#include <map>
#include <set>

#include "platform/camera/camgroup.h"
#include "webapi/include/lhwebapihandler.h"

// The source that the search's log lines name.
inline constexpr char kMultiPlayerSource[] = "multiplayer";

class MultiPlayerHandler : public LHHandlerBase<MultiPlayerHandler> {
  public:
    using LHWebAPIHandler::LHWebAPIHandler;

    // Serves "EnumEvent" and "SearchAvaiDate"; any other method does nothing.
    void HandleProcess();
    // Each ends with an answer on the response.
    void HandleEnumEvent();
    // At most 128 days: a larger "day_count" is taken as 128.
    void HandleSearchAvaiDate();

  private:
    // The cameras of a search: those of the group, or without a group those of the mount except the denied ones. A
    // group's cameras are not filtered here.
    struct CamChoice {
        int m_GroupId;
        int m_MountId;
        const std::set<int>& m_DeniedCams;
        const std::set<int>& m_DeniedGroups;
        const char* m_szFunc;
    };

    // Each returns false after a log line and a recorded error: for a user without a profile; for a group that the user
    // may not access or that does not exist. The log lines name func.
    bool CheckProfile(const PrivProfile& profile, unsigned int uid, const char* func);
    bool ChooseCameras(const CamChoice& choice, std::map<int, Camera>& cameras);
};
