// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/event_lookup.h"

#include "standalone/cli/console.h"
#include "standalone/store/mounts.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

using store::Events;
using store::Marks;
using store::MarkState;

Found RequireEvent(store::Store& store, int id) {
    Found found{Events(store).Find(id), std::nullopt};
    for (const auto& [name, kind] : store::MarkKindNames()) {
        found.mark = found.event || found.mark ? found.mark : Marks(store).Find(kind, id);
    }
    if (!found.event && !found.mark) {
        throw Failure(kNoInput, "there is no event ", id, ": see lookhaven event list");
    }
    return found;
}

std::filesystem::path FileOf(store::Store& store, const Found& found) {
    const int mount_id = found.event ? found.event->mount_id : found.mark->mount_id;
    const std::string& path = found.event ? found.event->path : found.mark->path;
    const bool has_file =
        found.event ? !found.event->demo : found.mark->state == MarkState::kSaved && !found.mark->demo;
    const auto mount = store::Mounts(store).Find(mount_id);
    return has_file && mount ? std::filesystem::path(mount->path) / path : std::filesystem::path();
}

std::vector<store::Event> RecordingsOf(store::Store& store, const Found& found) {
    return found.event ? std::vector{*found.event} : store::RecordingsOf(store, *found.mark);
}

}  // namespace lookhaven::cli
