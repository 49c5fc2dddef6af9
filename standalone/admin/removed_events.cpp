// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/removed_events.h"

#include <array>
#include <exception>
#include <optional>
#include <string>

#include "standalone/admin/change.h"
#include "standalone/archive/layout.h"
#include "standalone/base/log.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"
#include "standalone/store/transaction.h"

namespace lookhaven::admin {

namespace {

std::string ObjectOf(store::Store& store, const char* what, int camera_id, int id) {
    const auto camera = store::Cameras(store).Find(camera_id);
    return Named(camera ? camera->name : "removed camera", camera_id) + ", " + what + ' ' + std::to_string(id);
}

Json::Value SpanOf(const auto& event) {
    Json::Value json;
    json["start"] = Json::Int64{event.start_s};
    json["stop"] = Json::Int64{event.end_s};
    return json;
}

Change RemoveRecording(store::Store& store, const store::Event& recording) {
    store::Events events(store);
    const std::array ids{recording.id};
    const std::optional<store::Event> current = events.Find(recording.id);
    if (current && current->kept) {
        throw StillNeeded("event " + std::to_string(recording.id) + " is kept: release it first");
    }
    if (current && current->recording) {
        throw StillNeeded("event " + std::to_string(recording.id) +
                          " is still being recorded: try again when it has ended");
    }
    if (recording.demo) {
        events.Remove(ids);
    } else {
        if (events.BeginDeletion(ids) == 0 && current) {
            throw StillNeeded("event " + std::to_string(recording.id) + " was changed meanwhile: try again");
        }
    }
    return {"event.remove",
            ObjectOf(store, "event", recording.camera_id, recording.id),
            current ? SpanOf(*current) : Json::Value(),
            {}};
}

Change RemoveMark(store::Store& store, const store::Mark& mark) {
    if (mark.state == store::MarkState::kPending && !mark.demo) {
        throw StillNeeded("the footage of event " + std::to_string(mark.id) +
                          " is not complete yet: try again after its end");
    }
    const bool was_there = store::Marks(store).Remove(mark.id);
    const char* const what = mark.kind == store::MarkKind::kAlert ? "alert" : "POS transaction";
    return {
        "event.remove", ObjectOf(store, what, mark.camera_id, mark.id), was_there ? SpanOf(mark) : Json::Value(), {}};
}

// The file names recordings, and holds none. The mark's row is gone by now, so what fails is only logged.
void RemoveSpanFile(store::Store& store, const store::Mark& mark) {
    std::string why = "its mount is not mounted here";
    try {
        const auto name = archive::ParsePath(mark.path);
        const auto mount = store::Mounts(store).Find(mark.mount_id);
        const auto folder = mount ? maintenance::OpenMount(store, *mount) : std::nullopt;
        if (folder && name && name->kind == archive::FileKind::kSpan) {
            folder->Remove(*name);
            return;
        }
    } catch (const std::exception& error) {
        why = error.what();
    }
    base::LogWarning("the file " + mark.path + " of event " + std::to_string(mark.id) + " was not removed: " + why +
                     "; it holds the times of its footage, and no pictures");
}

}  // namespace

void RemoveEvents(store::Store& store, const Actor& actor, std::span<const store::Event> recordings,
                  const std::optional<store::Mark>& mark) {
    store::InTransaction(store, [&] {
        for (const store::Event& recording : recordings) {
            Apply(store, actor, [&] { return RemoveRecording(store, recording); });
        }
        if (mark) {
            Apply(store, actor, [&] { return RemoveMark(store, *mark); });
        }
    });
    if (mark && mark->state == store::MarkState::kSaved && !mark->demo) {
        RemoveSpanFile(store, *mark);
    }
}

}  // namespace lookhaven::admin
