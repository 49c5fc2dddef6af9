// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/log.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cstdlib>
#include <string>

#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/clock.h"

namespace lookhaven::base {

namespace {

std::atomic<const char*> g_program{"lookhaven"};
std::atomic<Severity> g_threshold{Severity::kInfo};

constexpr std::array<const char*, 4> kSeverityNames{"error", "warning", "info", "debug"};

}  // namespace

void SetLogProgram(const char* program) {
    g_program = program;
}

void SetLogThreshold(Severity threshold) {
    g_threshold = threshold;
}

void Log(Severity severity, std::string_view text) noexcept try {
    if (severity > g_threshold.load()) {
        return;
    }
    std::string line = FormatUtc(WallMillis()) + ' ' + g_program.load() + '[' + std::to_string(getpid()) + "] " +
                       kSeverityNames[static_cast<std::size_t>(severity)] + ": ";
    line += text.substr(0, text.find_last_not_of("\r\n") + 1);
    // A line stays one line, and nothing in it controls the terminal that shows it, by a control character of ASCII or,
    // in UTF-8, of those from U+0080 to U+009F.
    std::replace_if(
        line.begin(), line.end(), [](unsigned char c) { return c < 0x20 || c == 0x7f; }, ' ');
    for (std::size_t at = line.find('\xc2'); at < line.size() - 1; at = line.find('\xc2', at + 1)) {
        if (static_cast<unsigned char>(line[at + 1]) < 0xa0) {
            line.replace(at, 2, 2, ' ');
        }
    }
    line += '\n';
    // A log that cannot be written has nobody to tell.
    [[maybe_unused]] const ssize_t written = ::write(STDERR_FILENO, line.data(), line.size());
} catch (...) {
}

bool LogsToJournal() {
    const char* stream = std::getenv("JOURNAL_STREAM");  // "device:inode"; a child may have another standard error
    struct stat status {};
    return stream != nullptr && ::fstat(STDERR_FILENO, &status) == 0 &&
           stream == std::to_string(status.st_dev) + ':' + std::to_string(status.st_ino);
}

}  // namespace lookhaven::base
