// SPDX-License-Identifier: Apache-2.0
//
// The last errors in the log files of an installation: those of our programs (base/log.h) and of the web server.
//
// Invariants    (1) At most kMaxFiles files are read, the newest, and of each no more than its last kMaxFileBytes.
//               (2) Only regular files of one name are: no symbolic link, and none that another folder has, too.
//               (3) A text is UTF-8 in one line, of kMaxTextBytes at most, without account, password and query of any
//                   address in it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace lookhaven::doctor {

constexpr std::size_t kMaxFiles = 8;
constexpr std::size_t kMaxFileBytes = 256 << 10;
constexpr std::size_t kMaxTextBytes = 1'000;

struct LoggedError {
    std::int64_t time_ms = 0;  // since the epoch
    std::string process;       // "recorder", "web server"
    std::string text;
};

// What a log file holds at level error or above, as it stands there; lines of any other form are left out.
std::vector<LoggedError> ErrorsIn(std::string_view log);

struct LastErrors {
    std::vector<LoggedError> newest_first;
    bool has_files = false;  // whether there is a log file of ours at all
};

// limit: how many at most. A folder or file that cannot be read counts as none.
LastErrors ReadLastErrors(const std::filesystem::path& log_folder, std::size_t limit);

}  // namespace lookhaven::doctor
