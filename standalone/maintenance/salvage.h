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

// The row that the recording should have.
store::Event RowOf(const archive::FileName& name, int mount_id, const archive::Contents& contents);

// What was done, in a sentence with the recording's path; empty when all was well.
using Sentence = std::string;

// Closes the recording of a row that was left open, or whose file or index says something else. A row whose file is gone
// is removed, and one whose file holds nothing, with the file. Throws archive::ArchiveError when the recording is still
// being written, store::StoreError, std::system_error.
Sentence CloseEvent(store::Events& events, const MountFolder& mount, const store::Event& row);

// Gives a recording that has no row one, or removes what is left of a recording that never got as far as a frame. ids
// up to known_id were given out by this store; a recording with a later one is renumbered. What is no recording after
// all is left alone, which the sentence says. Throws as CloseEvent.
Sentence AdoptRecording(store::Events& events, const MountFolder& mount, int mount_id, const archive::FileName& name,
                        int known_id);

}  // namespace lookhaven::maintenance
