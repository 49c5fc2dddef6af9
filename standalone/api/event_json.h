// SPDX-License-Identifier: Apache-2.0
//
// Recorded events, alerts and POS transactions as VEXO.Event tells them.
#pragma once

#include <optional>
#include <vector>

#include <json/json.h>

#include "standalone/api/call.h"
#include "standalone/binding/rights.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"

namespace lookhaven::api {

// words: what it was found by, if it was; what is found of them in its text is told, too.
Json::Value Describe(const store::Mark& mark, const store::TextQuery& words = {});
Json::Value Describe(const store::Event& event);

// The same with whether it is kept, and of a recorded event the note and whose it is. A mark is kept when all
// recordings of its footage are.
Json::Value DescribeWithKeeping(store::Store& records, const store::Mark& mark);
Json::Value DescribeWithKeeping(store::Store& records, const store::Event& event);
// The same for several, with one query.
Json::Value DescribeWithKeeping(store::Store& records, const std::vector<store::Event>& events);

// Whether the caller may know of it.
template <typename AnyEvent>
bool IsVisible(const AnyEvent& event) {
    return binding::MayUse(event.camera_id, store::CameraAccess::kPlayback);
}

// Throws Failure 404 where there is none, or not for the caller.
template <typename AnyEvent>
void RequireVisible(const std::optional<AnyEvent>& event) {
    if (!event || !IsVisible(*event)) {
        throw Failure(404, "there is no such event");
    }
}

}  // namespace lookhaven::api
