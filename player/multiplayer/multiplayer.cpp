// SPDX-License-Identifier: Apache-2.0
//
// Who may search, and the cameras of a search.
#include "player/multiplayer/multiplayer.h"

#include "player/iter2string.h"

bool MultiPlayerHandler::CheckProfile(const PrivProfile& profile, unsigned int uid, const char* func) {
    if (profile.GetId() >= 1) {
        return true;
    }
    LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMultiPlayerSource, __LINE__, func,
                "Failed to load priv profile of Uid[%u].\n", uid);
    SetErrorCode(LH_WEBAPI_ERR_BAD_INPUT, "", "");
    return false;
}

bool MultiPlayerHandler::ChooseCameras(const CamChoice& choice, std::map<int, Camera>& cameras) {
    if (choice.m_GroupId < 1) {
        const std::set<int>& denied = choice.m_DeniedCams;
        cameras = GetCamMountMap(choice.m_MountId, Iter2String(denied.begin(), denied.end(), ","), true);
        return true;
    }
    if (choice.m_DeniedGroups.count(choice.m_GroupId) != 0) {
        LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMultiPlayerSource, __LINE__, choice.m_szFunc,
                    "Inaccessible camera group[%d].\n", choice.m_GroupId);
        SetErrorCode(LH_WEBAPI_ERR_BAD_INPUT, "", "");
        return false;
    }
    CamGroup group;
    if (group.Load(choice.m_GroupId) != 0) {
        LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMultiPlayerSource, __LINE__, choice.m_szFunc,
                    "Failed to load camera group[%d].\n", choice.m_GroupId);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return false;
    }
    cameras = group.GetCamMap();
    return true;
}
