// SPDX-License-Identifier: Apache-2.0
//
// The demo's installation, to which rows of recordings are added.
#pragma once

#include <cstdint>

#include "standalone/archive/layout.h"
#include "standalone/store/events.h"
#include "test/component/cli/program.h"

namespace lookhaven::cli {

inline constexpr std::int64_t kStart = 1'772'352'900;  // 2026-03-01T08:15:00Z

class RecordingsTest : public DemoTest {
  protected:
    int AddRow(store::Events& events, int camera, std::int64_t start_s, int reason, bool recording) {
        store::Event event;
        const int id = event.id = events.NextId();
        event.camera_id = camera, event.mount_id = 1, event.reason = reason, event.recording = recording;
        event.start_s = start_s, event.end_s = start_s + 300;
        event.path = archive::PathOf({camera, start_s, id, archive::FileKind::kRecording});
        events.Begin(event);
        return id;
    }
};

}  // namespace lookhaven::cli
