// SPDX-License-Identifier: Apache-2.0
//
// lookhaven setting: numbers that hold for the whole installation.
#include <array>
#include <memory>
#include <string>

#include "standalone/cli/commands.h"
#include "standalone/store/settings.h"

namespace lookhaven::cli {

namespace {

struct Setting {
    const char* name;
    int fallback;
    int least;
    int most;
    const char* meaning;
};

constexpr std::array<Setting, 2> kSettings = {
    {{"login_port", 8080, 1, 65535, "the port that clients are told for a direct log-in"},
     {"players_per_session", 1, 1, 16, "recorded events that one session may play side by side"}}};

struct Change {
    int value = 0;
};

void Show(const Console& console) {
    store::Store store = console.OpenStore();
    store::Settings settings(store);
    Rows rows{{"SETTING", "VALUE", "MEANING"}};
    Json::Value data(Json::objectValue);
    for (const Setting& setting : kSettings) {
        const std::string value = settings.Find(setting.name).value_or(std::to_string(setting.fallback));
        rows.push_back({setting.name, value, setting.meaning});
        data[setting.name] = value;
    }
    console.Answer(Table(rows), data);
}

}  // namespace

void AddSetting(CLI::App& program, Console& console) {
    CLI::App* group =
        program.add_subcommand("setting", "Numbers that hold for the whole installation")->require_subcommand(1);
    group->add_subcommand("show", "Shows them")->callback([&console] { Show(console); });
    CLI::App* set = group->add_subcommand("set", "Changes one")->require_subcommand(1);
    for (const Setting& setting : kSettings) {
        auto change = std::make_shared<Change>();
        CLI::App* one = set->add_subcommand(setting.name, setting.meaning);
        one->add_option("value", change->value)->required()->check(CLI::Range(setting.least, setting.most));
        one->callback([&console, &setting, change] {
            {
                store::Store store = console.OpenStore();
                store::Settings(store).Set(setting.name, std::to_string(change->value));
            }
            Show(console);
        });
    }
}

}  // namespace lookhaven::cli
