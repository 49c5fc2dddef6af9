// SPDX-License-Identifier: Apache-2.0
//
// What a player's process does before its player ends of its own accord.
#pragma once

namespace lookhaven::binding {

// The module's player removes the session's player file when it ends, unless SIGUSR1 has had it check whose that is.
// Where the file names another process, this raises the signal here, since the host may not have sent it yet. No
// other request handles the signal.
void LeavePlayerFile();

}  // namespace lookhaven::binding
