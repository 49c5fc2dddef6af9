// SPDX-License-Identifier: Apache-2.0
//
// Camera records of this host.
#pragma once

#include <list>
#include <string>

#include "platform/export.h"

// A stream profile of a camera, 0 … CAM_PROFILE_COUNT - 1; -1 is used on the wire for "the camera's own choice".
enum CAM_PROFILE_TYPE : int {
    CAM_PROFILE_DEFAULT = -1,
    CAM_PROFILE_HIGH = 0,
    CAM_PROFILE_LOW = 1,
};

// The codec of a camera's video. The module itself only tells MJPEG from the rest; the numbers go to clients.
enum CAM_VIDEO_TYPE : int {
    CAM_VIDEO_MJPEG = 1,
    CAM_VIDEO_H264 = 3,
    CAM_VIDEO_H265 = 6,
};

// Whether a camera has sound. The codec is named by each stream, since a camera may change it.
enum CAM_AUDIO_TYPE : int {
    CAM_AUDIO_NONE = 0,
    CAM_AUDIO_SUPPORTED = 1,
};

// The kind of camera.
enum CAM_DEVICE_TYPE : int {
    CAM_DEVICE_UNKNOWN = 0,
    CAM_DEVICE_FIXED = 1,
    CAM_DEVICE_PTZ = 2,
};

constexpr int CAM_NAME_SIZE = 256;
constexpr int CAM_PROFILE_COUNT = 3;

// A record is a value; a default-constructed one has id 0.
class LH_PLATFORM_API Camera {
  public:
    Camera();

    // Loads the camera's record without checking the caller's rights. serverId 0 is this host; archiveId 0 is the live
    // record. Returns 0, or non-zero when there is no such camera; then the record is unchanged.
    int Load(int camId, int serverId, int archiveId);
    // The same for a camera that a recording server owns, by its id there; afterwards m_Id is its id on this host.
    int LoadByIdOnRecServer(int idOnServer, int serverId);

    // The profile that is configured for the camera's live view.
    CAM_PROFILE_TYPE GetLiveProfile() const;
    // The number of the live stream that carries the profile; for a profile that the camera lacks, that of its live
    // profile.
    int GetUiStreamNo(CAM_PROFILE_TYPE profile) const;
    // The folder of the camera's recordings and recording log; empty when it has none or the caller may not play it
    // back. Reads the store on each call.
    std::string GetStoragePath() const;

    int m_Id;
    char m_szName[CAM_NAME_SIZE];  // UTF-8, NUL-terminated
    bool m_blEnabled;
    int m_VideoType;    // CAM_VIDEO_TYPE of the live stream
    int m_LiveProfile;  // CAM_PROFILE_TYPE
    int m_StreamNo[CAM_PROFILE_COUNT];
    int m_AudioType;             // CAM_AUDIO_TYPE
    int m_DeviceType;            // CAM_DEVICE_TYPE
    std::string m_OwnerDevName;  // the recording server that owns the camera; empty for this host's own
};

// The cameras of this host in list order. deniedIds: ids to leave out, decimal, ascending, joined by ",". groupIds:
// when not empty, only cameras of these groups. onlyEnabled leaves out disabled cameras, withDeleted adds removed ones
// whose recordings remain, withRemote adds cameras of recording servers; a platform may ignore the last two. Throws
// when the cameras cannot be read: an empty list would mean a host without cameras.
LH_PLATFORM_API std::list<Camera> GetCamLocalList(bool onlyEnabled, const std::string& groupIds,
                                                  const std::string& deniedIds, bool withDeleted, bool withRemote);

// The TCP port for direct login of clients; 0 or negative when there is none, which fails the whole camera list.
LH_PLATFORM_API int GetLoginPort();
