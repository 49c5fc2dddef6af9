// SPDX-License-Identifier: Apache-2.0
//
// Brings one recording and its row into agreement after something was cut short.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "standalone/archive/repair.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/events.h"

namespace lookhaven::maintenance {

// The row that the recording should have; the reason is continuous when the file does not say.
store::Event RowOf(const archive::FileName& name, int mount_id, const archive::Contents& contents);

// Both return what was done, as a sentence with the recording's path.

// Finishes the recording of a row that was left open or disagrees with its file or index, and the row. Removes a row
// whose file is missing; also one whose file holds no frame, with the file. Throws std::system_error, EBUSY while the
// recording is still being written; store::StoreError.
std::string CloseEvent(store::Events& events, const MountFolder& mount, const store::Event& row);

// Gives a recording without a row one, or removes a file that never got as far as its first frame. It keeps its own id
// when that is below keep_below, from where on the store may still assign ids, and no other event has it: a store
// that was restored from a backup assigns ids again. Else it gets new_id, from Events::NextId after the file was seen,
// and the place in the order of recording that its date says. A file that is no recording of ours is left alone, which
// the sentence says. Throws as CloseEvent.
std::string ImportRecording(store::Events& events, const MountFolder& mount, int mount_id,
                            const archive::FileName& name, int new_id, int keep_below);

// Whether the row is that of this recording.
bool IsRowOf(const std::optional<store::Event>& row, const archive::FileName& name);

}  // namespace lookhaven::maintenance
