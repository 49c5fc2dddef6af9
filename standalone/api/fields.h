// SPDX-License-Identifier: Apache-2.0
//
// The fields of records, out of the parameters of a call.
//
// Failures      Each throws Failure 400, which names the field.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "standalone/api/call.h"
#include "standalone/base/names.h"

namespace lookhaven::api {

// "<name> must be <what>"
[[noreturn]] void RefuseField(const std::string& name, const std::string& what);

// Each leaves target as it is where the value is null, and refuses another type.
void Take(const Json::Value& value, const std::string& name, bool& target);
void Take(const Json::Value& value, const std::string& name, int& target);
void Take(const Json::Value& value, const std::string& name, std::string& target);

// The same of a parameter of the call.
void TakeField(const Call& call, const char* name, bool& target);
void TakeField(const Call& call, const char* name, int& target);
void TakeField(const Call& call, const char* name, std::string& target);

// The id in that parameter, which must be there; 0, which nothing has, where it is larger than any.
int IdIn(const Call& call, const char* name);

// The limit in that parameter, a number above 0, up to max, in units; null is 0, which is none. Nothing where the
// parameter is missing.
std::optional<std::int64_t> LimitIn(const Call& call, const std::string& name, double max, double unit);
// The same of an age in days, as seconds.
std::optional<std::int64_t> AgeLimitIn(const Call& call, const std::string& name);

// As Take, for one of the words.
template <typename Value>
void TakeNamed(const Json::Value& value, const std::string& name, const base::Names<Value>& names, Value& target) {
    if (value.isNull()) {
        return;
    }
    const auto found = value.isString() ? names.find(value.asString()) : names.end();
    if (found == names.end()) {
        std::string list;
        for (const auto& [each, meaning] : names) {
            list += (list.empty() ? "" : ", ") + each;
        }
        RefuseField(name, "one of " + list);
    }
    target = found->second;
}

}  // namespace lookhaven::api
