// SPDX-License-Identifier: Apache-2.0
//
// The commands, a file each; every function adds its own below the program and answers through the console, which must
// outlive the program.
#pragma once

#include <CLI/CLI.hpp>

#include "standalone/cli/console.h"

namespace lookhaven::cli {

void AddInit(CLI::App& program, Console& console);
void AddLog(CLI::App& program, Console& console);
void AddCamera(CLI::App& program, Console& console);
void AddUser(CLI::App& program, Console& console);
void AddDemo(CLI::App& program, Console& console);
void AddDoctor(CLI::App& program, Console& console);

}  // namespace lookhaven::cli
