// SPDX-License-Identifier: Apache-2.0
//
// Recorded events: one section of a camera's recording, or the footage of an alert or of a POS transaction.
#pragma once

#include <cstdint>
#include <list>
#include <set>
#include <string>

#include "platform/camera/camera.h"
#include "platform/export.h"

// Which record an event id names.
enum REC_EVENT_TYPE : int {
    REC_EVENT_RECORDED = 0,
    REC_EVENT_ALERT = 1,
    REC_EVENT_POS = 2,
};

// Why a recording was made.
enum REC_METHOD : int {
    REC_METHOD_CONTINUOUS = 1,
    REC_METHOD_ALARM = 3,
};

// A recorded event. A record is a value; a default-constructed one has id 0.
class LH_PLATFORM_API Event {
  public:
    Event();

    // Loads the event. mountId: the mount that must hold it, 0 for any; serverId and archiveId 0: this host's own.
    // Returns 0, or non-zero when there is no such event or the caller may not see it; then the record is unchanged.
    int Load(int eventId, int mountId, int serverId, int archiveId);

    // True when the event has footage on a mount.
    bool IsSaved() const;
    // The file to open for playback; empty when nothing is saved.
    std::string GetFullPath() const;

    int GetId() const;
    int GetIdOnRecServer() const;  // 0 for an event of this host
    std::string GetPath() const;   // for display: relative to the mount
    int GetStartTm() const;        // seconds since the epoch (UTC)
    int GetEndTm() const;          // the same; of a growing event the last second on the mount, never 0
    int GetFrameCount() const;
    int GetVdoType() const;         // CAM_VIDEO_TYPE
    int GetRecMethod() const;       // REC_METHOD
    std::string GetAudFmt() const;  // the codec's name; empty without sound
    int GetImgW() const;            // pixels
    int GetImgH() const;
    bool GetRecording() const;      // still being written
    bool GetArchived() const;       // exempt from retention
    std::uint64_t GetSize() const;  // bytes
    bool IsOriginalView() const;    // a fisheye camera's picture, not dewarped

    int m_Id;
    int m_CamId;
    int m_StartTm;
    int m_EndTm;
    int m_FrameCount;
    int m_VdoType;
    int m_RecMethod;
    int m_ImgW;
    int m_ImgH;
    bool m_blSaved;
    bool m_blRecording;
    bool m_blArchived;
    std::uint64_t m_Size;
    std::string m_Path;
    std::string m_FullPath;
    std::string m_AudFmt;
};

// An alert of a device or of video analytics; its footage is a span of recorded events.
class LH_PLATFORM_API AlertEvent : public Event {
  public:
    // As Event::Load; mountId is 0, since alerts are not bound to a mount.
    int Load(int eventId, int mountId, int serverId, int archiveId);
};

// A transaction of a POS terminal; its footage is a span of recorded events.
class LH_PLATFORM_API PosEvent {
  public:
    PosEvent();

    // As Event::Load; mountId is 0, since transactions are not bound to a mount.
    int Load(int eventId, int mountId, int serverId, int archiveId);
    bool IsSaved() const;
    std::string GetFullPath() const;

  private:
    Event m_Footage;
};

// Makes the part of a growing event that has been recorded so far playable: asks the recording service and waits a
// bounded time. Returns 0, or non-zero when the service failed; the module plays what there is either way.
LH_PLATFORM_API int DoEventTimelyPlay(const Event& event, REC_EVENT_TYPE type);

// True when the path exists, whatever it is; false for the empty path.
LH_PLATFORM_API bool IsFileExist(const std::string& path);
