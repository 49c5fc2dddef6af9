// SPDX-License-Identifier: Apache-2.0
//
// What a user may not access, and the user's privilege level.
#pragma once

#include <memory>
#include <set>

#include <json/json.h>

#include "platform/export.h"

// Kinds of access to a camera.
enum CAM_PRIV_TYPE : int {
    CAM_PRIV_LIVEVIEW = 1,
    CAM_PRIV_PLAYBACK = 2,
    CAM_PRIV_AUDIO = 8,
};

// Kinds of access to an e-map.
enum ITEM_PRIV_TYPE : int {
    ITEM_PRIV_VIEW = 2,
};

// Kinds of access to a door.
enum DOOR_PRIV_TYPE : int {
    DOOR_PRIV_VIEW = 1,
};

// The user id that stands for a paired host admitted by pair matching. No account has it.
constexpr unsigned int PAIR_AUTH_UID = 1024;

// A value: copies are independent of each other.
class LH_PLATFORM_API PrivProfile {
  public:
    // The platform's own data behind a profile.
    struct Data;

    // An empty profile: GetId() is 0. Its sets must not be asked for.
    PrivProfile();
    explicit PrivProfile(std::shared_ptr<const Data> data);

    // The profile's id; 0 when there is none for the user.
    int GetId() const;
    // 0 and 1 manage the host; larger numbers do not.
    int GetPrivilege() const;
    // The ids of cameras to which the user lacks the kind of access. withHidden: also existing cameras that the user's
    // lists hide, as those of removed groups. Each set throws when it cannot be read: an empty one would deny nothing.
    std::set<int> GetInaCamIdSet(CAM_PRIV_TYPE type, bool withHidden) const;
    // The ids of camera groups to which the user lacks the kind of access (a CAM_PRIV_TYPE).
    std::set<int> GetInaPrivPerCamGrpIdSet(int type) const;
    // The ids of e-maps and of I/O modules that the user may not see. withHidden as above.
    std::set<int> GetInaEmapIdSet(ITEM_PRIV_TYPE type, bool withHidden) const;
    std::set<int> GetInaIOIdSet(bool withHidden) const;
    // Restricts the profile to the rights that a relaying host sends along; null changes nothing. Never adds a right,
    // whatever the client sent.
    void UpdateByJson(const Json::Value& privData);

  private:
    std::shared_ptr<const Data> m_pData;
};

// The user's profile, read from the store on each call. PAIR_AUTH_UID gives the profile of a paired host, which denies
// nothing. For an unknown user the result's GetId() is 0.
LH_PLATFORM_API PrivProfile PrivProfileGetByUid(unsigned int uid);

// True when the profile gives the kind of access to the door.
LH_PLATFORM_API bool IsDoorPrivAllowed(const PrivProfile& profile, DOOR_PRIV_TYPE type, int doorId);
