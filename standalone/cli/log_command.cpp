// SPDX-License-Identifier: Apache-2.0
//
// lookhaven log: how much the processes of the installation log.
#include <algorithm>
#include <map>
#include <memory>
#include <optional>

#include "standalone/base/process.h"
#include "standalone/cli/commands.h"
#include "standalone/control/debug_log_config.h"

namespace lookhaven::cli {

namespace {

const std::map<std::string, int> kLevels = {{"off", 0},    {"error", 1}, {"warning", 3},
                                            {"notice", 4}, {"info", 5},  {"debug", 6}};
const std::map<std::string, int> kCategories = {{"liveview", 32}, {"player", 68}};

struct Change {
    int level = 0;
    std::vector<int> categories;
    std::vector<pid_t> processes;
};

std::string NameOf(const std::map<std::string, int>& names, int number) {
    const auto found =
        std::find_if(names.begin(), names.end(), [number](const auto& entry) { return entry.second == number; });
    return found == names.end() ? std::to_string(number) : found->first;
}

void Show(const Console& console) {
    const control::DebugLogConfig* config = control::MapDebugLog(console.Installation());
    if (config == nullptr) {
        throw Failure(kNoInput, "there is no log configuration yet: run lookhaven init");
    }
    // Most of the 512 categories are nobody's and stay at the level that most have.
    std::map<int, int> uses;
    for (const int level : config->category_level) {
        ++uses[level];
    }
    const int common =
        std::max_element(uses.begin(), uses.end(), [](auto& a, auto& b) { return a.second < b.second; })->first;
    Json::Value data;
    data["other_categories"] = common;
    data["categories"] = data["processes"] = Json::arrayValue;
    Rows rows = {{"what", "level"}};
    for (int category = 0; category < control::kDebugLogCategoryCount; ++category) {
        const int level = config->category_level[category];
        const std::string name = NameOf(kCategories, category);
        if (level != common || kCategories.contains(name)) {
            Json::Value entry;
            entry["category"] = category;
            entry["name"] = name;
            entry["level"] = level;
            data["categories"].append(entry);
            rows.push_back({"category " + name, NameOf(kLevels, level)});
        }
    }
    rows.push_back({"other categories", NameOf(kLevels, common)});
    for (int i = 0; i < std::min(config->process_count, control::kDebugLogProcessCount); ++i) {
        Json::Value entry;
        entry["pid"] = config->process[i].pid;
        entry["level"] = config->process[i].level;
        data["processes"].append(entry);
        rows.push_back(
            {"process " + std::to_string(config->process[i].pid), NameOf(kLevels, config->process[i].level)});
    }
    console.Answer(Table(rows), data);
}

void Set(const Console& console, const Change& change) {
    control::DebugLogEditor editor(console.Installation());
    for (const pid_t pid : change.processes) {
        if (change.level != 0 && base::ProcessStartTicks(pid) == 0) {
            throw Failure(kDataError, "there is no process " + std::to_string(pid));
        }
    }
    for (const int category : change.categories) {
        editor.SetCategory(category, change.level);
    }
    for (const pid_t pid : change.processes) {
        if (change.level == 0) {
            editor.RemoveProcess(pid);
        } else {
            editor.SetProcess(pid, change.level);
        }
    }
    if (change.categories.empty() && change.processes.empty()) {
        editor.SetEveryCategory(change.level);
    }
    Show(console);
}

}  // namespace

void AddLog(CLI::App& program, Console& console) {
    CLI::App* log = program.add_subcommand("log", "How much the processes log")->require_subcommand(1);
    log->add_subcommand("show", "Shows the levels")->callback([&console] { Show(console); });
    CLI::App* set = log->add_subcommand("set", "Sets the level of categories or processes, or of every category");
    auto change = std::make_shared<Change>();
    Choose(set->add_option("level", change->level, "What is logged: this and all that is worse"), kLevels)->required();
    set->add_option("--category", change->categories, "A category by name or number; may be repeated")
        ->allow_extra_args(false)
        ->transform(CLI::Transformer(kCategories).description(""))
        ->type_name("liveview|player|NUMBER")
        ->check(CLI::Range(0, control::kDebugLogCategoryCount - 1));
    set->add_option("--process", change->processes, "A process id; may be repeated")
        ->allow_extra_args(false)
        ->check(CLI::PositiveNumber);
    set->callback([&console, change] { Set(console, *change); });
}

}  // namespace lookhaven::cli
