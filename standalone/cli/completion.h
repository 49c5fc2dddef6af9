// SPDX-License-Identifier: Apache-2.0
//
// What a shell offers when Tab is pressed, from the same tree of commands as the help: "lookhaven __complete word…".
//
// Why so        The scripts for each shell stay a few lines long, and know no command by name.
#pragma once

#include <string>
#include <vector>

#include <CLI/CLI.hpp>

namespace lookhaven::cli {

// The first argument that asks for completion.
constexpr const char* kCompletionWord = "__complete";

// What the last of the words, which may be empty, can become: commands, options, or the values of an option that takes
// one of a few. Empty where any text is allowed; the shell offers files then. words: without the program's name.
std::vector<std::string> CompletionsOf(const CLI::App& program, const std::vector<std::string>& words);

}  // namespace lookhaven::cli
