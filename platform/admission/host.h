// SPDX-License-Identifier: Apache-2.0
//
// The state of this host: its role, its service, the processors its tasks run on.
#pragma once

#include <string>

#include "platform/export.h"

// True when this host manages other recording servers (central management).
LH_PLATFORM_API bool IsCmsHost();

// True when the recording service of this host is up.
LH_PLATFORM_API bool IsLHRunning();

// The id of the recording server that owns the camera; 0 for this host's own cameras and for unknown ones.
LH_PLATFORM_API int GetCamOwnerHxId(int camId);

class LH_PLATFORM_API LHTaskSet {
  public:
    // Binds the calling process to the processors of the named task set; the empty name is the default set. Best
    // effort: a failure is not reported.
    static void SetAffinity(const std::string& taskSet);
};
