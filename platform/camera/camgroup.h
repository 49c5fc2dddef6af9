// SPDX-License-Identifier: Apache-2.0
//
// Sets of cameras: those of a group, and those that record on a mount.
#pragma once

#include <map>
#include <string>

#include "platform/camera/camera.h"
#include "platform/export.h"

// A record is a value.
class LH_PLATFORM_API CamGroup {
  public:
    CamGroup();

    // Returns 0, or non-zero when there is no such group; then the record is unchanged.
    int Load(int groupId);
    // The group's cameras by id, without those that the caller may not play back: the module does not filter them.
    std::map<int, Camera> GetCamMap() const;

  private:
    int m_Id;
};

// The cameras that record or have recordings on the mount, by id; mount 0: every camera. deniedIds: ids to leave out,
// decimal, ascending, joined by ",". withDeleted adds removed cameras whose recordings remain.
LH_PLATFORM_API std::map<int, Camera> GetCamMountMap(int mountId, const std::string& deniedIds, bool withDeleted);
