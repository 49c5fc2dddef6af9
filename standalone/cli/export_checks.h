// SPDX-License-Identifier: Apache-2.0
//
// lookhaven export verify, lookhaven export key: what an exported file proves, and by which key.
#pragma once

#include <CLI/CLI.hpp>

#include "standalone/cli/console.h"

namespace lookhaven::cli {

// Adds both to the command "export". The console must outlive it.
void AddExportChecks(CLI::App& command, const Console& console);

}  // namespace lookhaven::cli
