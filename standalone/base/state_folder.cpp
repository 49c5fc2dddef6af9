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
    for (const char* file :
         {"lookhaven.db", "store", "debug-log", "run/server.lock", "run/webapi.sock", "tls/made-here"}) {
        if (const auto status = std::filesystem::status(home / file, ignored);
            std::filesystem::is_regular_file(status) || std::filesystem::is_socket(status)) {
            return true;
        }
    }
    return false;
}

}  // namespace lookhaven::base
