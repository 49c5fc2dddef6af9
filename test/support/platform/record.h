// SPDX-License-Identifier: Apache-2.0
//
// Access to the current script, and the recording of calls, for the functions of the double.
#pragma once

#include <sstream>

#include "test/support/platform/scripted_platform.h"

namespace lookhaven::test {

inline ScriptedPlatform& Script() {
    return *CurrentPlatform();
}

// JSON on one line.
std::string Text(const Json::Value& value);

// Records name(argument,argument…).
template <typename... Arguments>
void Call(const char* name, const Arguments&... arguments) {
    std::ostringstream text;
    [[maybe_unused]] const char* separator = "";
    text << name << '(';
    ((text << separator << arguments, separator = ","), ...);
    text << ')';
    Script().Record(text.str());
}

}  // namespace lookhaven::test
