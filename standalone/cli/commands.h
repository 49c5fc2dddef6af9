// SPDX-License-Identifier: Apache-2.0
//
// The commands, a file each; every function adds its own below the program and answers through the console, which must
// outlive the program.
#pragma once

#include <map>
#include <string>

#include <CLI/CLI.hpp>

#include "standalone/cli/console.h"

namespace lookhaven::cli {

// Makes the option take the map's names, and show them as its form.
template <typename T>
CLI::Option* Choose(CLI::Option* option, const std::map<std::string, T>& names) {
    std::string form;
    for (const auto& entry : names) {
        form += (form.empty() ? "" : "|") + entry.first;
    }
    return option->transform(CLI::CheckedTransformer(names).description(""))->type_name(form);
}

void AddInit(CLI::App& program, Console& console);
void AddLog(CLI::App& program, Console& console);
void AddCamera(CLI::App& program, Console& console);
void AddUser(CLI::App& program, Console& console);
void AddDemo(CLI::App& program, Console& console);
void AddEvent(CLI::App& program, Console& console);
void AddMount(CLI::App& program, Console& console);
void AddGroup(CLI::App& program, Console& console);
void AddEmap(CLI::App& program, Console& console);
void AddDevices(CLI::App& program, Console& console);
void AddServer(CLI::App& program, Console& console);
void AddSetting(CLI::App& program, Console& console);
void AddVerify(CLI::App& program, Console& console);
void AddDoctor(CLI::App& program, Console& console);

}  // namespace lookhaven::cli
