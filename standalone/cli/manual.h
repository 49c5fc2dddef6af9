// SPDX-License-Identifier: Apache-2.0
//
// Manual pages of the commands, from what --help shows.
#pragma once

#include <filesystem>

#include <CLI/CLI.hpp>

namespace lookhaven::cli {

// "lookhaven __manual <folder>" writes the manual pages; used when a package is built.
constexpr const char* kManualWord = "__manual";

// Writes lookhaven-<command>.1 for each command of the program into the folder. Throws std::system_error.
void WriteManual(const CLI::App& program, const std::filesystem::path& folder);

}  // namespace lookhaven::cli
