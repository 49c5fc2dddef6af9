// SPDX-License-Identifier: Apache-2.0
//
// The footage of an event that the caller may play back, and the frames in it.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>

#include "standalone/api/call.h"
#include "standalone/archive/recording_reader.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/users.h"

namespace lookhaven::api {

struct Footage {
    int id = 0;
    std::optional<store::MarkKind> kind;  // nothing for a recorded event
    int camera_id = 0;
    int mount_id = 0;
    std::int64_t start_s = 0;
    std::int64_t end_s = 0;
    bool grows = false;          // more of a recorded event may come
    std::filesystem::path path;  // relative to the mount; once it was required, absolute
    int host_id = 0;             // as in store::Event
};

// The call's parameter "kind". Throws Failure 400 for what is neither "alert" nor "pos"; nothing when it is missing.
std::optional<store::MarkKind> KindOf(const Call& call);

// On whatever host, and without checking rights; nothing when there is no such event, or no footage of it.
std::optional<Footage> FindFootage(store::Store& records, std::optional<store::MarkKind> kind, int id);
// That of the call's event, or else what its camera recorded last at or before time_ms. Throws Failure 400 where
// neither is given, 404 where the camera is unknown to the caller or has nothing recorded.
std::optional<Footage> FindRequestedFootage(const Call& call);

// The call's event and kind. Throws Failure 404 when there is no such event, it has no footage, or the caller lacks
// that access to its camera.
Footage RequireFootage(const Call& call, store::CameraAccess access = store::CameraAccess::kPlayback);
// The same of FindRequestedFootage, to play it back.
Footage RequestedFootage(const Call& call);

// Opens it, with all that the recorder has of it up to that time. Closes the store. Throws Failure 404 when nothing is
// recorded yet; archive::ArchiveError, std::system_error.
archive::RecordingReader OpenFootage(const Call& call, const Footage& footage, std::int64_t until_ms);

// The index of the last frame at or before that time, by the wall clock; the first or the last one for a time outside.
int FrameAt(const archive::RecordingReader& recording, std::int64_t time_ms);

// The index of the call's frame, or else of that at time_ms. Throws Failure 404 where the recording has no such frame.
int RequestedFrame(const Call& call, const archive::RecordingReader& recording);

// The method Frame of VEXO.Event.
std::string FrameAtTime(const Call& call);

}  // namespace lookhaven::api
