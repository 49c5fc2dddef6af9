// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/log_levels.h"

#include <charconv>

#include "standalone/admin/log_levels.h"
#include "standalone/api/fields.h"
#include "standalone/api/revision.h"

namespace lookhaven::api {

namespace {

// Processes are the operator's matter: an id means nothing here.
std::string AnswerRecord(Json::Value record) {
    record.removeMember("process");
    Json::Value data;
    data["log"] = record;
    data["log"]["known"] = Json::arrayValue;
    for (const auto& [name, level] : admin::LogLevels()) {
        data["log"]["known"].append(name);
    }
    return SuccessAnswer(data);
}

int CategoryOf(const std::string& name) {
    if (const auto found = admin::LogCategories().find(name); found != admin::LogCategories().end()) {
        return found->second;
    }
    int number = -1;
    const auto [end, error] = std::from_chars(name.data(), name.data() + name.size(), number);
    if (error != std::errc() || end != name.data() + name.size()) {
        RefuseField("category", "one of those that LogLevels lists");
    }
    return number;
}

}  // namespace

std::string LogLevels(const Call& call) {
    admin::RequireManager(call.Records(), call.Actor());
    return AnswerRecord(admin::LogRecord(call.context.Installation()));
}

std::string SetLogLevels(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    admin::LogChange change;
    if (const Json::Value& others = call.Parameter("others"); !others.isNull()) {
        TakeNamed(others, "others", admin::LogLevels(), change.others.emplace());
    }
    const Json::Value& categories = call.Parameter("category");
    if (!categories.isNull() && !categories.isArray()) {
        RefuseField("category", "a list");
    }
    for (const Json::Value& category : categories) {
        if (!category.isObject() || !category["name"].isString() || category["level"].isNull()) {
            RefuseField("category", "a list of names with their levels");
        }
        TakeNamed(category["level"], "level", admin::LogLevels(),
                  change.categories[CategoryOf(category["name"].asString())]);
    }
    return AnswerRecord(admin::SetLogLevels(call.Records(), call.context.Installation(), call.Actor(), seen, change));
}

}  // namespace lookhaven::api
