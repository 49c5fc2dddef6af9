// SPDX-License-Identifier: Apache-2.0
//
// Who has logged in, and who was refused: a line each.
//
// Why so        In files of their own, log-ins.log and refused-log-ins.log. Anybody can fill the other logs, and with
//               wrong passwords that of the refusals, until what happened before is rotated away; nobody can fill that
//               of the log-ins without a password.
#pragma once

#include <string_view>

#include "standalone/base/installation.h"

namespace lookhaven::api {

// The account as the client gave it, any bytes. Never throws: a line that cannot be written to its file goes to the
// host's log.
void LogAccepted(const base::Installation& installation, std::string_view account, std::string_view address);
void LogRefused(const base::Installation& installation, std::string_view account, std::string_view address,
                std::string_view reason);

}  // namespace lookhaven::api
