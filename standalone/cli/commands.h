// SPDX-License-Identifier: Apache-2.0
//
// The commands, a file each; every function adds its own to the program. The console must outlive the program's run.
#pragma once

#include <CLI/CLI.hpp>

#include "standalone/cli/console.h"

namespace lookhaven::cli {

void AddInit(CLI::App& program, const Console& console);
void AddSetupAddress(CLI::App& program, const Console& console);
void AddAudit(CLI::App& program, const Console& console);
void AddCamera(CLI::App& program, const Console& console);
void AddUser(CLI::App& program, const Console& console);
void AddToken(CLI::App& program, const Console& console);
void AddCertificate(CLI::App& program, const Console& console);
void AddLog(CLI::App& program, const Console& console);
void AddGroup(CLI::App& program, const Console& console);
void AddMount(CLI::App& program, const Console& console);
void AddEvent(CLI::App& program, const Console& console);
void AddExport(CLI::App& program, const Console& console);
void AddEmap(CLI::App& program, const Console& console);
void AddDevices(CLI::App& program, const Console& console);
void AddHosts(CLI::App& program, const Console& console);
void AddServer(CLI::App& program, const Console& console);
void AddSetting(CLI::App& program, const Console& console);
void AddStore(CLI::App& program, const Console& console);
void AddBackup(CLI::App& program, const Console& console);
void AddVerify(CLI::App& program, const Console& console);
void AddDemo(CLI::App& program, const Console& console);
void AddDoctor(CLI::App& program, const Console& console);

}  // namespace lookhaven::cli
