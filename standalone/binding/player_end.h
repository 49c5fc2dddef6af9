// SPDX-License-Identifier: Apache-2.0
//
// What a player's process does before its player ends by itself.
#pragma once

namespace lookhaven::binding {

// The module's player removes the session's player file when it ends, unless SIGUSR1 has asked it whose that is. Asks
// it in the host's place, which may not have done so yet, where the file names another process. No other request
// listens to the signal.
void LeavePlayerFile();

}  // namespace lookhaven::binding
