// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/state_folder.h"

#include <cstdlib>
#include <system_error>

namespace lookhaven::base {

std::filesystem::path DefaultHome() {
    const char* home = std::getenv("LOOKHAVEN_HOME");
    return home != nullptr && *home != '\0' ? home : LOOKHAVEN_DEFAULT_HOME;
}

bool IsStateFolder(const std::filesystem::path& home) {
    std::error_code ignored;
    for (const char* file : {"lookhaven.db", "store", "debug-log", "run/server.lock"}) {
        if (std::filesystem::is_regular_file(home / file, ignored)) {
            return true;
        }
    }
    return false;
}

}  // namespace lookhaven::base
