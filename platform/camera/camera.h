// SPDX-License-Identifier: Apache-2.0
//
// Camera records of this host.
#pragma once

#include <list>
#include <string>

#include "platform/export.h"

// A stream profile of a camera; -1 is used on the wire for "the camera's own choice".
enum CAM_PROFILE_TYPE : int {
    CAM_PROFILE_DEFAULT = -1,
    CAM_PROFILE_HIGH = 0,
    CAM_PROFILE_LOW = 1,
    CAM_PROFILE_MOBILE = 2,
};

// How a camera codes its video. Only MJPEG matters to the module.
enum CAM_VIDEO_TYPE : int {
    CAM_VIDEO_MJPEG = 1,
    CAM_VIDEO_MPEG4 = 2,
    CAM_VIDEO_H264 = 3,
    CAM_VIDEO_H265 = 6,
};

constexpr int CAM_NAME_SIZE = 256;
constexpr int CAM_PROFILE_COUNT = 3;

// A record is a value; a default-constructed one has id 0.
class LH_PLATFORM_API Camera {
  public:
    Camera();

    // Loads the record of the camera, whether or not the caller may see it. serverId 0 is this host; archiveId 0 is the
    // live record. Returns 0, or non-zero when there is no such camera; then the record is unchanged.
    int Load(int camId, int serverId, int archiveId);
    // Likewise for a camera that a recording server owns, by its id there.
    int LoadByIdOnRecServer(int idOnServer, int serverId);

    // The profile that the camera's live view is configured to show.
    CAM_PROFILE_TYPE GetLiveProfile() const;
    // The number of the live stream that carries the profile. A profile that the camera lacks gives the live profile's.
    int GetUiStreamNo(CAM_PROFILE_TYPE profile) const;
    // The folder that holds the camera's recordings and recording log; empty when it has none.
    std::string GetStoragePath() const;

    int m_Id;
    char m_szName[CAM_NAME_SIZE];  // UTF-8, NUL-terminated
    bool m_blEnabled;
    int m_VideoType;    // CAM_VIDEO_TYPE of the live stream
    int m_LiveProfile;  // CAM_PROFILE_TYPE
    int m_StreamNo[CAM_PROFILE_COUNT];
    bool m_blPtz;    // the camera moves
    bool m_blAudio;  // the camera hears
    std::string m_StoragePath;
    int m_AudioType = 0;         // how the camera codes its sound, as the recorder numbers it; 0: none, or unknown
    int m_DeviceType = 0;        // the recorder's number for the kind of device
    std::string m_OwnerDevName;  // the recording server that owns the camera; empty for this host's own
};

// The cameras of this host in list order. deniedIds: ids to leave out, decimal, ascending, joined by ",". groupIds:
// when not empty, only cameras of these groups. onlyEnabled leaves out disabled cameras, withDeleted adds removed ones
// whose recordings remain, withRemote adds cameras of recording servers.
LH_PLATFORM_API std::list<Camera> GetCamLocalList(bool onlyEnabled, const std::string& groupIds,
                                                  const std::string& deniedIds, bool withDeleted, bool withRemote);

// The port at which a client logs in directly; 0 or negative when there is none.
LH_PLATFORM_API int GetLoginPort();
