// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/player_end.h"

#include <csignal>

#include <unistd.h>

#include "standalone/binding/request_context.h"
#include "standalone/control/player_file.h"

namespace lookhaven::binding {

void LeavePlayerFile() {
    const pid_t newest = control::ReadPlayerFile(RequestContext::Current().Session());
    if (newest > 0 && newest != ::getpid()) {
        std::raise(SIGUSR1);
    }
}

}  // namespace lookhaven::binding
