// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/keep.h"

#include <vector>

#include "standalone/admin/kept_events.h"
#include "standalone/api/event_json.h"
#include "standalone/api/footage.h"

namespace lookhaven::api {

namespace {

std::vector<store::Event> RequireRecordings(const Call& call) {
    const int id = call.Parameter("event").asInt();
    if (const auto kind = KindOf(call)) {
        const auto mark = store::Marks(call.Records()).Find(*kind, id);
        RequireVisible(mark);
        return RecordingsOf(call.Records(), *mark);
    }
    const auto event = store::Events(call.Records()).Find(id);
    RequireVisible(event);
    return {*event};
}

}  // namespace

std::string Keep(const Call& call) {
    if (!binding::IsManager()) {
        throw Failure(403, "this account may not keep events");
    }
    std::vector<int> ids;
    for (const store::Event& event : RequireRecordings(call)) {
        ids.push_back(event.id);
    }
    const Json::Value& keep = call.Parameter("keep");
    const int changed = keep.isNull() || keep.asBool()
                            ? admin::KeepEvents(call.Records(), call.Actor(), ids, call.Parameter("note").asString())
                            : admin::ReleaseEvents(call.Records(), call.Actor(), ids);
    if (changed == 0) {  // deleted meanwhile, or nothing of it was recorded
        throw Failure(404, "there is no such event");
    }
    Json::Value data;
    data["event"] = Json::arrayValue;
    for (const int id : ids) {
        if (const auto event = store::Events(call.Records()).Find(id)) {
            data["event"].append(DescribeWithKeeping(call.Records(), *event));
        }
    }
    return SuccessAnswer(data);
}

}  // namespace lookhaven::api
