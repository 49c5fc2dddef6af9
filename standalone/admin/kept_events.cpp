// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/kept_events.h"

#include <array>

#include "standalone/admin/change.h"
#include "standalone/base/clock.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/transaction.h"

namespace lookhaven::admin {

namespace {

// Null for what is not kept. Without the time, so that keeping again with the same keeper and note is no change.
Json::Value AuditedKeepRecord(store::Store& store, int id) {
    const auto event = store::Events(store).Find(id);
    if (!event || !event->kept) {
        return {};
    }
    const store::KeepRecord record = store::KeptEvents(store).Find(id).value_or(store::KeepRecord());
    Json::Value json;
    json["note"] = record.note;
    json["keeper"] = record.keeper;
    return json;
}

std::string NameOf(store::Store& store, int id) {
    const auto event = store::Events(store).Find(id);
    const auto camera = event ? store::Cameras(store).Find(event->camera_id) : std::nullopt;
    const std::string name = camera ? camera->name : "removed camera";
    return Named(name, event ? event->camera_id : 0) + ", event " + std::to_string(id);
}

template <typename Make>
int ChangeEach(store::Store& store, const Actor& actor, const char* action, const std::vector<int>& ids, Make make) {
    int changed = 0;
    store::InTransaction(store, [&] {
        for (const int id : ids) {
            Apply(store, actor, [&] {
                const Json::Value before = AuditedKeepRecord(store, id);
                changed += make(std::array{id});
                return Change{action, NameOf(store, id), before, AuditedKeepRecord(store, id)};
            });
        }
    });
    return changed;
}

}  // namespace

int KeepEvents(store::Store& store, const Actor& actor, const std::vector<int>& ids, const std::string& note) {
    const store::KeepRecord record{note, actor.user_id == 0 ? "" : actor.name, base::WallSeconds()};
    return ChangeEach(store, actor, "event.keep", ids,
                      [&](const auto& id) { return store::KeptEvents(store).Keep(id, record); });
}

int ReleaseEvents(store::Store& store, const Actor& actor, const std::vector<int>& ids) {
    return ChangeEach(store, actor, "event.release", ids,
                      [&](const auto& id) { return store::KeptEvents(store).Release(id); });
}

}  // namespace lookhaven::admin
