// SPDX-License-Identifier: Apache-2.0
//
// JSON without spaces, as jsoncpp's writer with an empty indentation, UTF-8 and 17 digits writes it.
//
// Why so        That writer looks each member up by its name again and sends every piece through a stream of its own: a
//               list of thousands of events took longer to write than to read from the store.
#pragma once

#include <string>

#include <json/json.h>

#include "platform/export.h"

namespace lookhaven::binding {

// Takes what the library takes; text that is not UTF-8, and numbers that JSON lacks, come out as from the library.
// Throws std::bad_alloc alone, and has appended a part of the value then.
LH_PLATFORM_API void AppendCompactJson(std::string& text, const Json::Value& value);

}  // namespace lookhaven::binding
