// SPDX-License-Identifier: Apache-2.0
//
// Finds the file of an event's recording.
#include "player/mjpegstreamer/event_file.h"

#include "platform/recording/event.h"
#include "player/mjpegstreamer/mjpegstreamer.h"

namespace {

template <typename AnyEvent>
std::string SavedFilename(const AnyEvent& event) {
    return event.IsSaved() ? event.GetFullPath() : std::string();
}

// Alert and POS events are not bound to a mount.
template <typename AnyEvent>
std::string MountlessFilename(int eventId, const char* func) {
    AnyEvent event;
    if (event.Load(eventId, 0, 0, 0) != 0) {
        LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, __LINE__, func,
                    "Failed to load event[%d].\n", eventId);
        return {};
    }
    return SavedFilename(event);
}

}  // namespace

std::string GetRecordedFilename(int mountId, int eventId) {
    Event event;
    if (event.Load(eventId, mountId, 0, 0) != 0) {
        LH_TRACE(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, "Failed to load event[%d] on mount[%d].\n",
                 eventId, mountId);
        return {};
    }
    return SavedFilename(event);
}

std::string GetAlertEventFilename(int eventId) {
    return MountlessFilename<AlertEvent>(eventId, __func__);
}

std::string GetPosEventFilename(int eventId) {
    return MountlessFilename<PosEvent>(eventId, __func__);
}
