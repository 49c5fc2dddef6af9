// SPDX-License-Identifier: Apache-2.0
//
// An event as its row is bound: what it holds, in the types that SOCI takes. For this folder's sources.
#pragma once

#include <soci/soci.h>

#include "standalone/store/events.h"

namespace lookhaven::store {

// SOCI binds long long, whatever std::int64_t is.
using Number = long long;

struct EventRow {
    static constexpr const char* kSelect =
        "select id, camera_id, mount_id, start_s, end_s, recording, reason, frame_count,"
        " size_bytes, video_type, audio_codec, width, height, path, archived, demo from events";

    Event event;
    Number start = 0;
    Number end = 0;
    Number size = 0;
    int recording = 0;
    int video_type = 0;
    int archived = 0;
    int demo = 0;

    EventRow() = default;
    explicit EventRow(const Event& from) { Assign(from); }

    void Assign(const Event& from) {
        event = from;
        start = from.start_s;
        end = from.end_s;
        size = from.size_bytes;
        recording = from.recording;
        video_type = static_cast<int>(from.video_type);
        archived = from.archived;
        demo = from.demo;
    }

    // The row as an event; borrowed until the next one is fetched.
    const Event& Read() {
        event.start_s = start;
        event.end_s = end;
        event.size_bytes = size;
        event.recording = recording != 0;
        event.video_type = static_cast<base::Codec>(video_type);
        event.archived = archived != 0;
        event.demo = demo != 0;
        return event;
    }

    // Binds all columns in the order of kSelect to what the query gives.
    void BindTo(soci::statement& statement) {
        statement.exchange(soci::into(event.id));
        statement.exchange(soci::into(event.camera_id));
        statement.exchange(soci::into(event.mount_id));
        statement.exchange(soci::into(start));
        statement.exchange(soci::into(end));
        statement.exchange(soci::into(recording));
        statement.exchange(soci::into(event.reason));
        statement.exchange(soci::into(event.frame_count));
        statement.exchange(soci::into(size));
        statement.exchange(soci::into(video_type));
        statement.exchange(soci::into(event.audio_codec));
        statement.exchange(soci::into(event.width));
        statement.exchange(soci::into(event.height));
        statement.exchange(soci::into(event.path));
        statement.exchange(soci::into(archived));
        statement.exchange(soci::into(demo));
    }
};

}  // namespace lookhaven::store
