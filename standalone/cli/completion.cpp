// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/completion.h"

#include <algorithm>
#include <sstream>

namespace lookhaven::cli {

namespace {

// The option of that name of the command, or one that it inherits from a parent command; null when there is none.
const CLI::Option* FindOption(const CLI::App& command, const std::string& name) {
    for (const CLI::App* app = &command; app != nullptr; app = app->get_parent()) {
        if (const CLI::Option* option = app->get_option_no_throw(name)) {
            return option;
        }
    }
    return nullptr;
}

bool TakesValue(const CLI::Option& option) {
    return option.get_items_expected_max() > 0;
}

const CLI::App* FindCommand(const CLI::App& app, const std::string& name) {
    const auto commands = app.get_subcommands([&name](const CLI::App* each) { return each->get_name() == name; });
    return commands.empty() ? nullptr : commands.front();
}

// "always|never|alarm", as OneOf writes it.
std::vector<std::string> ValuesOf(const CLI::Option& option) {
    std::vector<std::string> values;
    const std::string form = option.get_type_name();
    if (form.find('|') != std::string::npos) {
        std::istringstream parts(form);
        for (std::string part; std::getline(parts, part, '|');) {
            values.push_back(part);
        }
    }
    return values;
}

std::vector<std::string> OptionsOf(const CLI::App& command) {
    std::vector<std::string> names;
    for (const CLI::App* app = &command; app != nullptr; app = app->get_parent()) {
        for (const CLI::Option* option : app->get_options()) {
            for (const std::string& name : option->get_lnames()) {
                names.push_back("--" + name);
            }
        }
    }
    std::sort(names.begin(), names.end());
    names.erase(std::unique(names.begin(), names.end()), names.end());  // each command has its --help
    return names;
}

// Commands, or what an argument without a name may be.
std::vector<std::string> NextOf(const CLI::App& command) {
    std::vector<std::string> names;
    for (const CLI::App* each :
         command.get_subcommands([](const CLI::App* app) { return !app->get_group().empty(); })) {
        names.push_back(each->get_name());
    }
    if (names.empty()) {
        for (const CLI::Option* option : command.get_options()) {
            const std::vector<std::string> values = option->get_positional() ? ValuesOf(*option) : names;
            names.insert(names.end(), values.begin(), values.end());
        }
    }
    return names;
}

}  // namespace

std::vector<std::string> CompletionsOf(const CLI::App& program, const std::vector<std::string>& words) {
    const CLI::App* command = &program;
    const CLI::Option* awaited = nullptr;  // the option whose value comes next
    for (std::size_t i = 0; i + 1 < words.size(); ++i) {
        if (awaited != nullptr) {
            awaited = nullptr;
        } else if (words[i].starts_with('-')) {
            const CLI::Option* option = FindOption(*command, words[i]);
            awaited = option != nullptr && TakesValue(*option) ? option : nullptr;
        } else if (const CLI::App* next = FindCommand(*command, words[i])) {
            command = next;
        }
    }
    const std::string last = words.empty() ? "" : words.back();
    std::vector<std::string> candidates = awaited != nullptr      ? ValuesOf(*awaited)
                                          : last.starts_with('-') ? OptionsOf(*command)
                                                                  : NextOf(*command);
    std::erase_if(candidates, [&last](const std::string& each) { return !each.starts_with(last); });
    return candidates;
}

}  // namespace lookhaven::cli
