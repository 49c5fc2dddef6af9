// SPDX-License-Identifier: Apache-2.0
//
// Manual pages of the commands, from what --help shows.
#pragma once

#include <filesystem>

#include <CLI/CLI.hpp>

namespace lookhaven::cli {

// "lookhaven __manual <folder>", as the first word: for whoever makes a package.
constexpr const char* kManualWord = "__manual";

// Writes lookhaven-<command>.1 for each command of the program into the folder. Throws std::system_error.
void WriteManual(const CLI::App& program, const std::filesystem::path& folder);

}  // namespace lookhaven::cli
