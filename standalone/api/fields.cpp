// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/fields.h"

#include <cmath>

namespace lookhaven::api {

void RefuseField(const std::string& name, const std::string& what) {
    throw Failure(400, name + " must be " + what);
}

void Take(const Json::Value& value, const std::string& name, bool& target) {
    if (!value.isNull() && !value.isBool()) {
        RefuseField(name, "true or false");
    }
    target = value.isNull() ? target : value.asBool();
}

void Take(const Json::Value& value, const std::string& name, int& target) {
    if (!value.isNull() && !value.isInt()) {
        RefuseField(name, "a whole number");
    }
    target = value.isNull() ? target : value.asInt();
}

void Take(const Json::Value& value, const std::string& name, std::string& target) {
    if (!value.isNull() && !value.isString()) {
        RefuseField(name, "a text");
    }
    target = value.isNull() ? target : value.asString();
}

void TakeField(const Call& call, const char* name, bool& target) {
    Take(call.Parameter(name), name, target);
}

void TakeField(const Call& call, const char* name, int& target) {
    Take(call.Parameter(name), name, target);
}

void TakeField(const Call& call, const char* name, std::string& target) {
    Take(call.Parameter(name), name, target);
}

int IdIn(const Call& call, const char* name) {
    const Json::Value& id = call.Parameter(name);
    if (!id.isInt64()) {
        RefuseField(name, "a number");
    }
    return id.isInt() ? id.asInt() : 0;
}

std::optional<std::int64_t> LimitIn(const Call& call, const std::string& name, double max, double unit) {
    if (!call.parameters.contains(name)) {
        return std::nullopt;
    }
    const Json::Value& value = call.Parameter(name);
    if (value.isNull()) {
        return 0;
    }
    const double number = value.isNumeric() ? value.asDouble() : 0;
    if (!(number * unit >= 1 && number <= max)) {
        RefuseField(name, "a number above 0, or null for no limit");
    }
    return std::llround(number * unit);
}

std::optional<std::int64_t> AgeLimitIn(const Call& call, const std::string& name) {
    constexpr double kMaxDays = 36'500;
    constexpr double kDayS = 86'400;
    return LimitIn(call, name, kMaxDays, kDayS);
}

}  // namespace lookhaven::api
