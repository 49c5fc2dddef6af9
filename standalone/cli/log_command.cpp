// SPDX-License-Identifier: Apache-2.0
//
// lookhaven log: the log levels of the installation's processes.
#include <algorithm>

#include "standalone/admin/log_levels.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/table.h"
#include "standalone/control/debug_log_config.h"

namespace lookhaven::cli {

namespace {

struct Request {
    int level = 0;
    std::vector<int> categories;
    std::vector<pid_t> processes;
};

constexpr Column kColumns[] = {{"what", "what"}, {"level", "level", [](const Json::Value& level) {
                                                      return NameOf(admin::LogLevels(), level.asInt());
                                                  }}};

std::string LevelTable(const Json::Value& data) {
    Json::Value rows = Json::arrayValue;
    for (const Json::Value& category : data["categories"]) {
        rows.append(Object("what", "category " + category["name"].asString(), "level", category["level"]));
    }
    rows.append(Object("what", "other categories", "level", data["other_categories"]));
    for (const Json::Value& process : data["processes"]) {
        rows.append(Object("what", "process " + process["pid"].asString(), "level", process["level"]));
    }
    return Table(kColumns, rows);
}

void Show(const Console& console) {
    const control::DebugLogConfig* config = control::MapDebugLog(console.Installation());
    if (config == nullptr) {
        throw Failure(kNoInput, "there is no log configuration yet: run lookhaven init");
    }
    const Json::Value categories = Array(admin::ListedCategories(*config), [config](int category) {
        return Object("category", category, "name", NameOf(admin::LogCategories(), category), "level",
                      config->category_level[category]);
    });
    Json::Value processes = Json::arrayValue;
    for (int i = 0; i < std::min(config->process_count, control::kDebugLogProcessCount); ++i) {
        processes.append(Object("pid", config->process[i].pid, "level", config->process[i].level));
    }
    const Json::Value data =
        Object("other_categories", admin::CommonLevel(*config), "categories", categories, "processes", processes);
    console.Answer(data, LevelTable(data));
}

void Set(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    admin::LogChange change;
    for (const int category : request.categories) {
        change.categories[category] = request.level;
    }
    for (const pid_t pid : request.processes) {
        change.processes[pid] = request.level;
    }
    if (request.categories.empty() && request.processes.empty()) {
        change.every = request.level;
    }
    admin::SetLogLevels(store, console.Installation(), {}, {}, change);
    Show(console);
}

}  // namespace

void AddLog(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "log", "Log levels");
    Request& request = group.request();
    const auto category = [](CLI::Option& option) {
        option.transform(CLI::Transformer(admin::LogCategories()).description(""))
            ->type_name("liveview|player|requests|NUMBER");
        option.check(CLI::Range(0, control::kDebugLogCategoryCount - 1));
    };
    group.Add("show", "Shows the log levels", Show);
    group.Add("set", "Sets the log level of categories or processes, or of all categories", Set)
        .Option("level", request.level, "Log messages of this level and more severe ones", OneOf(admin::LogLevels()),
                Required)
        .Option("--category", request.categories, "A category by name or number; may be repeated", Repeatable, category)
        .Option("--process", request.processes, "A process id; may be repeated", Repeatable,
                Satisfies(CLI::PositiveNumber));
}

}  // namespace lookhaven::cli
