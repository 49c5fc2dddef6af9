// SPDX-License-Identifier: Apache-2.0
//
// What an id of the command line names: a recorded event, an alert or a POS transaction, and its footage.
#pragma once

#include <filesystem>
#include <optional>
#include <vector>

#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/store.h"

namespace lookhaven::cli {

// An event or a mark: their ids come from one counter.
struct Found {
    std::optional<store::Event> event;
    std::optional<store::Mark> mark;
};

// Throws Failure when there is neither.
Found RequireEvent(store::Store& store, int id);

// Empty when there is no file.
std::filesystem::path FileOf(store::Store& store, const Found& found);

// The event itself, or the recordings that the mark's footage lies in.
std::vector<store::Event> RecordingsOf(store::Store& store, const Found& found);

}  // namespace lookhaven::cli
