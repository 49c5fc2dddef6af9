// SPDX-License-Identifier: Apache-2.0
//
// How events and marks are shown.
#pragma once

#include <string>

#include <json/json.h>

#include "standalone/store/events.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/marks.h"

namespace lookhaven::cli {

// All that the record says.
Json::Value ToData(const store::Event& event);
// words: what it was found by, if it was.
Json::Value ToData(const store::Mark& mark, const store::TextQuery& words = {});

// Tables of a list of such data.
std::string EventTable(const Json::Value& events);
std::string MarkTable(const Json::Value& marks);

// The record in several lines.
std::string Description(const store::Event& event);
std::string Description(const store::Mark& mark);
std::string Description(const store::KeepRecord& record);

}  // namespace lookhaven::cli
