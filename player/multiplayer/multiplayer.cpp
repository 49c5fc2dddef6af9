// SPDX-License-Identifier: Apache-2.0
//
// Dispatches the methods of event search, and selects the cameras of a search.
#include "player/multiplayer/multiplayer.h"

#include "player/iter2string.h"
#include "player/multiplayer/time_zone_keys.h"

const std::array<std::string, 43> kTimeZoneKeys = {
    "utc_n720", "utc_n660", "utc_n600", "utc_n570", "utc_n540", "utc_n510", "utc_n480", "utc_n420", "utc_n360",
    "utc_n300", "utc_n270", "utc_n240", "utc_n210", "utc_n180", "utc_n150", "utc_n120", "utc_n60",  "utc_0",
    "utc_60",   "utc_120",  "utc_180",  "utc_210",  "utc_240",  "utc_270",  "utc_300",  "utc_330",  "utc_345",
    "utc_360",  "utc_390",  "utc_420",  "utc_480",  "utc_510",  "utc_525",  "utc_540",  "utc_570",  "utc_600",
    "utc_630",  "utc_660",  "utc_720",  "utc_765",  "utc_780",  "utc_825",  "utc_840",
};

void MultiPlayerHandler::HandleProcess() {
    const std::string method = m_pRequest->GetAPIMethod();
    LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_INFO, kMultiPlayerSource, "Method [%s], Params [%s]\n", method.c_str(),
             m_pRequest->GetParam("", Json::Value()).toStyledString().c_str());
    if (method == "EnumEvent") {
        HandleEnumEvent();
    } else if (method == "SearchAvaiDate") {
        HandleSearchAvaiDate();
    }
}

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
