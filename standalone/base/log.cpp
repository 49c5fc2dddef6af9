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
#include "standalone/base/journal.h"

// The shared libraries of one process have a copy of this file each. Exported, the program's own is the one that all of
// them call, so that what is set in one holds for the lines of all.
#define LOOKHAVEN_ONE_IN_PROCESS [[gnu::visibility("default")]]

namespace lookhaven::base {

namespace {

std::atomic<const char*> g_program{"lookhaven"};
std::atomic<Severity> g_threshold{Severity::kInfo};

thread_local int t_camera = 0;
thread_local std::string t_account;

struct SeverityForm {
    const char* name;
    int priority;  // of syslog
};
constexpr std::array<SeverityForm, 4> kSeverities{{{"error", 3}, {"warning", 4}, {"info", 6}, {"debug", 7}}};

// A line stays one line, and nothing in it controls the terminal that shows it, by a control character of ASCII or,
// in UTF-8, of those from U+0080 to U+009F.
std::string OneLine(std::string_view text) {
    std::string line(text.substr(0, text.find_last_not_of("\r\n") + 1));
    std::replace_if(
        line.begin(), line.end(), [](unsigned char c) { return c < 0x20 || c == 0x7f; }, ' ');
    for (std::size_t at = line.find('\xc2'); at < line.size() - 1; at = line.find('\xc2', at + 1)) {
        if (static_cast<unsigned char>(line[at + 1]) < 0xa0) {
            line.replace(at, 2, 2, ' ');
        }
    }
    return line;
}

}  // namespace

LOOKHAVEN_ONE_IN_PROCESS void SetLogProgram(const char* program) {
    g_program = program;
}

LOOKHAVEN_ONE_IN_PROCESS void SetLogThreshold(Severity threshold) {
    g_threshold = threshold;
}

LOOKHAVEN_ONE_IN_PROCESS void SetLogCamera(int camera) {
    t_camera = camera;
}

LOOKHAVEN_ONE_IN_PROCESS void SetLogAccount(std::string_view account) {
    t_account = OneLine(account);
}

LOOKHAVEN_ONE_IN_PROCESS void Log(Severity severity, std::string_view text) noexcept try {
    if (severity > g_threshold.load()) {
        return;
    }
    const SeverityForm& form = kSeverities[static_cast<std::size_t>(severity)];
    const std::string message = OneLine(text);
    if (LogsToJournal() && SendToJournal({form.priority, g_program.load(), message, t_camera, t_account})) {
        return;
    }
    // The journal takes the number for the line's priority.
    const std::string priority = LogsToJournal() ? '<' + std::to_string(form.priority) + '>' : std::string();
    const std::string line = priority + FormatUtc(WallMillis()) + ' ' + g_program.load() + '[' +
                             std::to_string(getpid()) + "] " + form.name + ": " + message + '\n';
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
