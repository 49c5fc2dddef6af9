// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/marks.h"

#include <algorithm>
#include <string>
#include <vector>

#include "standalone/archive/span_file.h"
#include "standalone/base/log.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"

namespace lookhaven::maintenance {

namespace {

std::vector<store::Event> FootageOf(store::Events& events, const store::Mark& mark) {
    store::EventFilter filter;
    filter.camera_ids = {mark.camera_id};
    filter.begin_s = mark.start_s;
    filter.end_s = std::max(mark.end_s, mark.start_s + 1);
    std::vector<store::Event> footage = events.List(filter);
    std::erase_if(footage, [](const store::Event& event) { return event.demo; });
    return footage;
}

bool IsComplete(const std::vector<store::Event>& footage, const store::Mark& mark) {
    return std::ranges::any_of(footage, [&](const store::Event& event) { return event.end_s >= mark.end_s; });
}

// A span file can only name recordings of one mount: here that of the last one.
archive::Span SpanOf(const std::vector<store::Event>& footage, const store::Mark& mark) {
    archive::Span span{mark.start_s * 1000, mark.end_s * 1000, {}};
    for (const store::Event& event : footage) {
        if (event.mount_id == footage.back().mount_id && archive::ParsePath(event.path)) {
            span.recordings.push_back(event.path.substr(event.path.find('/') + 1));
        }
    }
    return span;
}

}  // namespace

bool SaveMark(store::Store& store, const store::Mark& mark) {
    store::Events events(store);
    const std::vector<store::Event> footage = FootageOf(events, mark);
    if (footage.empty()) {
        base::LogWarning("there is no footage of mark " + std::to_string(mark.id));
        return store::Marks(store).Miss(mark.id, mark.state);
    }
    const std::optional<store::Mount> mount = store::Mounts(store).Find(footage.back().mount_id);
    const std::optional<MountFolder> folder = mount ? OpenMount(store, *mount) : std::optional<MountFolder>();
    if (!folder) {
        return false;
    }
    const archive::FileName name{mark.camera_id, mark.start_s, mark.id, archive::FileKind::kSpan};
    archive::MakeFolderFor(folder->Path(), name);
    archive::WriteSpan(folder->Path() / archive::PathOf(name), SpanOf(footage, mark));
    return store::Marks(store).Save(mark.id, mount->id, archive::PathOf(name));
}

void CompleteMarks(store::Store& store, int mount_id, std::int64_t now_s, const FootageIsComplete& is_complete) {
    for (const store::Mark& mark : store::Marks(store).Pending()) {
        if (mark.end_s > now_s) {
            continue;
        }
        try {
            // First: a row that comes in between is then seen.
            const bool ended = is_complete(mark);
            store::Events events(store);
            const std::vector<store::Event> footage = FootageOf(events, mark);
            const int held_by = footage.empty() ? 0 : footage.back().mount_id;
            if (held_by == mount_id && (ended || IsComplete(footage, mark))) {
                SaveMark(store, mark);
            }
        } catch (const store::StoreError&) {
            throw;
        } catch (const std::exception& failure) {
            base::LogWarning("mark " + std::to_string(mark.id) + " waits: " + failure.what());
        }
    }
}

}  // namespace lookhaven::maintenance
