// SPDX-License-Identifier: Apache-2.0
//
// How events are stored. For this folder's sources.
#pragma once

#include "standalone/store/events.h"
#include "standalone/store/query.h"

namespace lookhaven::store {

template <>
struct Mapping<Event> {
    static constexpr const char* kTable = "events";
    static constexpr const char* kColumns =
        "id, camera_id, mount_id, start_s, end_s, recording, reason, frame_count, size_bytes, video_type, audio_codec,"
        " width, height, path, archived, demo, recording_order, host_id";
    static auto Members(auto& event) {
        return std::tie(event.id, event.camera_id, event.mount_id, event.start_s, event.end_s, event.recording,
                        event.reason, event.frame_count, event.size_bytes, event.video_type, event.audio_codec,
                        event.width, event.height, event.path, event.kept, event.demo, event.order, event.host_id);
    }
};

struct EventPendingDeletion : Event {};

template <>
struct Mapping<EventPendingDeletion> : Mapping<Event> {
    static constexpr const char* kTable = "events_pending_deletion";
};

}  // namespace lookhaven::store
