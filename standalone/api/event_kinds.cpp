// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/event_kinds.h"

#include <algorithm>

#include "standalone/api/call.h"

namespace lookhaven::api {

EventKinds::EventKinds(const Json::Value& asked) {
    if (asked.isNull()) {
        return;
    }
    continuous = alarm = alert = pos = false;
    const std::string text = asked.asString();
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t end = std::min(text.find(',', at), text.size());
        Choose(text.substr(at, end - at));
        at = end + 1;
    }
}

void EventKinds::Choose(const std::string& name) {
    bool* const kind = name == "continuous" ? &continuous
                       : name == "alarm"    ? &alarm
                       : name == "alert"    ? &alert
                       : name == "pos"      ? &pos
                                            : nullptr;
    if (kind == nullptr) {
        throw Failure(400, "kinds must be of continuous, alarm, alert and pos");
    }
    *kind = true;
}

store::Reasons EventKinds::Reasons() const {
    return continuous && alarm ? store::Reasons::kAny
           : continuous        ? store::Reasons::kContinuous
                               : store::Reasons::kOthers;
}

std::optional<store::MarkKind> EventKinds::OnlyMark() const {
    return alert && pos ? std::nullopt : std::optional(alert ? store::MarkKind::kAlert : store::MarkKind::kPos);
}

}  // namespace lookhaven::api
