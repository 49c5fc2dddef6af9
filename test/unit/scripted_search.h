// SPDX-License-Identifier: Apache-2.0
//
// Runs a search for recorded events against the scripted platform.
#pragma once

#include "player/multiplayer/multiplayer.h"
#include "test/support/platform/scripted_platform.h"

namespace lookhaven::test {

// A search of cameras 2 and 4 by a user who may not access cameras 9 and 12 nor group 6.
struct Search : ScriptedPlatform {
    explicit Search(const char* searched) {
        method = searched;
        log_cfg.m_CategLevel[68] = 1;
        denied_cameras = {12, 9};
        denied_groups = {6};
        for (const int id : {2, 4}) {
            mount_cameras[id] = MakeCamera(id, CAM_VIDEO_H265);
        }
        group_cameras[12] = MakeCamera(12, CAM_VIDEO_MJPEG);
        params = {{"start", 1000000}, {"from", 1000000}, {"to", 1000060}, {"cameralists", "2"}};
    }
    void Run() { MultiPlayerHandler(Request(), Response()).HandleProcess(); }
};

inline const Calls kProfile = {"GetLoginUID()", "PrivProfileGetByUid(7)"};
inline const Calls kMount = {"GetInaPrivPerCamGrpIdSet(2)", "GetCamMountMap(3,9,12,1)"};

}  // namespace lookhaven::test
