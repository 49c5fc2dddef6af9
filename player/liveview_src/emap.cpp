// SPDX-License-Identifier: Apache-2.0
//
// The description of an e-map: its picture and the items that the user may see.
#include "platform/emap/emap.h"

#include <cstdio>

#include "platform/admission/host.h"
#include "player/liveview_src/emap_items.h"
#include "player/liveview_src/live_loop.h"
#include "player/liveview_src/liveview_src.h"

void LiveviewSrcHandler::LiveviewEmap(int emapId) {
    const unsigned int uid = GetPrivUid();
    std::map<int, SlaveHx> servers;
    if (IsCmsHost()) {
        servers = SlaveHxMgr(true).GetSlaveHxMap(false, false, false);
    }
    Emap emap;
    if (emap.Load(emapId) != 0) {
        LH_LOG(kLiveviewSource, "Cannot load emap id = %d.\n", emapId);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    const std::string image = emap.GetImgName();
    const std::size_t dot = image.rfind('.');
    if (dot == std::string::npos) {
        LH_LOG(kLiveviewSource, "Not found the E-map extension name\n");
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    EmapItems items(*GetPrivProfile(), std::move(servers));
    items.Add(emap);
    items.Filter(uid);

    Json::Value reply;
    int length = 0;
    reply["emap"] = LoadEmapImgBase64String(image, length);
    reply["emapLength"] = std::to_string(length);
    reply["emapType"] = image.substr(dot + 1);
    reply["items"] = items.List();
    reply["itemNum"] = static_cast<int>(reply["items"].size());
    reply["hideItemName"] = emap.GetHideItemName();
    reply["smallItemSize"] = emap.GetSmallItemSize();
    m_pResponse->SetSuccess(reply);
    fflush(stdout);
}
