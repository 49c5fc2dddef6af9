// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/log_levels.h"

#include <algorithm>

#include "standalone/admin/change.h"
#include "standalone/base/process.h"

namespace lookhaven::admin {

namespace {

constexpr int kErrorsOnly = 1;  // of a configuration that nobody has made yet

bool HasName(int category) {
    return std::ranges::any_of(LogCategories(), [category](const auto& named) { return named.second == category; });
}

Json::Value Entry(const char* key, const Json::Value& of, int level) {
    Json::Value json;
    json[key] = of;
    json["level"] = base::NameOf(LogLevels(), level);
    return json;
}

Json::Value RecordOf(const control::DebugLogConfig& config) {
    Json::Value json;
    json["category"] = Json::arrayValue;
    for (const int category : ListedCategories(config)) {
        json["category"].append(
            Entry("name", base::NameOf(LogCategories(), category), config.category_level[category]));
    }
    json["others"] = base::NameOf(LogLevels(), CommonLevel(config));
    const std::int64_t revision = RevisionOf(json);
    json["process"] = Json::arrayValue;
    for (int i = 0; i < std::min(config.process_count, control::kDebugLogProcessCount); ++i) {
        json["process"].append(Entry("pid", config.process[i].pid, config.process[i].level));
    }
    json["revision"] = Json::Int64{revision};
    return json;
}

// {"liveview": "debug", "others": "error", "process 5": "info"}
Json::Value Audited(const Json::Value& record) {
    Json::Value json;
    for (const Json::Value& category : record["category"]) {
        json[category["name"].asString()] = category["level"];
    }
    json["others"] = record["others"];
    for (const Json::Value& process : record["process"]) {
        json["process " + process["pid"].asString()] = process["level"];
    }
    return json;
}

void RequirePossible(const LogChange& change) {
    std::set<int> levels;
    for (const std::optional<int>& level : {change.every, change.others}) {
        levels.insert(level.value_or(0));
    }
    for (const auto& [category, level] : change.categories) {
        if (category < 0 || category >= control::kDebugLogCategoryCount) {
            throw store::InvalidRecord("log categories have the numbers 0 to " +
                                       std::to_string(control::kDebugLogCategoryCount - 1));
        }
        levels.insert(level);
    }
    for (const auto& [pid, level] : change.processes) {
        if (level != 0 && base::ProcessStartTicks(pid) == 0) {
            throw store::InvalidRecord("there is no process " + std::to_string(pid));
        }
        levels.insert(level);
    }
    const base::Names<int>& known = LogLevels();
    for (const int level : levels) {
        if (std::ranges::none_of(known, [level](const auto& named) { return named.second == level; })) {
            throw store::InvalidRecord("there is no log level " + std::to_string(level));
        }
    }
}

void Make(control::DebugLogEditor& editor, const LogChange& change) {
    const std::set<int> listed = ListedCategories(editor.Config());
    if (change.every) {
        editor.SetEveryCategory(*change.every);
    }
    for (int category = 0; change.others && category < control::kDebugLogCategoryCount; ++category) {
        if (!listed.contains(category)) {
            editor.SetCategory(category, *change.others);
        }
    }
    for (const auto& [category, level] : change.categories) {
        editor.SetCategory(category, level);
    }
    for (const auto& [pid, level] : change.processes) {
        if (level == 0) {
            editor.RemoveProcess(pid);
        } else {
            editor.SetProcess(pid, level);
        }
    }
}

}  // namespace

const base::Names<int>& LogLevels() {
    static const base::Names<int> names = {{"off", 0},    {"error", 1}, {"warning", 3},
                                           {"notice", 4}, {"info", 5},  {"debug", 6}};
    return names;
}

const base::Names<int>& LogCategories() {
    static const base::Names<int> names = {{"liveview", 32}, {"player", 68}, {"requests", control::kRequestsCategory}};
    return names;
}

int CommonLevel(const control::DebugLogConfig& config) {
    std::map<int, int> uses;
    for (const int level : config.category_level) {
        ++uses[level];
    }
    return std::max_element(uses.begin(), uses.end(), [](auto& a, auto& b) { return a.second < b.second; })->first;
}

std::set<int> ListedCategories(const control::DebugLogConfig& config) {
    const int common = CommonLevel(config);
    std::set<int> listed;
    for (int category = 0; category < control::kDebugLogCategoryCount; ++category) {
        if (HasName(category) || config.category_level[category] != common) {
            listed.insert(category);
        }
    }
    return listed;
}

Json::Value LogRecord(const base::Installation& installation) {
    if (const control::DebugLogConfig* config = control::MapDebugLog(installation); config != nullptr) {
        return RecordOf(*config);
    }
    control::DebugLogConfig initial{};
    std::ranges::fill(initial.category_level, kErrorsOnly);
    return RecordOf(initial);
}

Json::Value SetLogLevels(store::Store& store, const base::Installation& installation, const Actor& actor,
                         std::optional<std::int64_t> seen, const LogChange& change) {
    RequirePossible(change);
    Json::Value record;
    Apply(store, actor, [&] {
        control::DebugLogEditor editor(installation);
        const Json::Value before = RecordOf(editor.Config());
        RequireCurrent(before, seen);
        Make(editor, change);
        record = RecordOf(editor.Config());
        return Change{"log.set", "thresholds", Audited(before), Audited(record)};
    });
    return record;
}

}  // namespace lookhaven::admin
