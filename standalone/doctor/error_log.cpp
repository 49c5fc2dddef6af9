// SPDX-License-Identifier: Apache-2.0
#include "standalone/doctor/error_log.h"

#include <algorithm>
#include <charconv>
#include <ctime>
#include <functional>
#include <iterator>
#include <optional>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/base/io.h"
#include "standalone/base/text.h"
#include "standalone/media/source_url.h"

namespace lookhaven::doctor {

namespace {

constexpr std::size_t kMaxEntries = 1'000;  // of the folder that are looked at
constexpr std::size_t kMaxNameBytes = 40;
constexpr std::string_view kNameCharacters = "abcdefghijklmnopqrstuvwxyz-";

bool IsPrefix(std::string_view text, std::string_view form) {
    return text.size() >= form.size() &&
           std::equal(form.begin(), form.end(), text.begin(), [](char wanted, char found) {
               return wanted == '0' ? found >= '0' && found <= '9' : wanted == found;
           });
}

int NumberAt(std::string_view text, std::size_t at, std::size_t digits) {
    int number = 0;
    std::from_chars(text.data() + at, text.data() + at + digits, number);
    return number;
}

// "2026-03-01T08:15:30" in either form of date.
std::tm DateAt(std::string_view text) {
    std::tm date{};
    date.tm_year = NumberAt(text, 0, 4) - 1900;
    date.tm_mon = NumberAt(text, 5, 2) - 1;
    date.tm_mday = NumberAt(text, 8, 2);
    date.tm_hour = NumberAt(text, 11, 2);
    date.tm_min = NumberAt(text, 14, 2);
    date.tm_sec = NumberAt(text, 17, 2);
    date.tm_isdst = -1;
    return date;
}

// In one line of UTF-8; what is no text becomes a space or U+FFFD. Ends with "…" where it was longer.
std::string Printable(std::string_view text) {
    std::string printable;
    while (!text.empty()) {
        const std::string_view rest = text;
        const std::optional<char32_t> character = base::TakeCharacter(text);
        if (!character) {
            text = rest.substr(1);
        }
        const bool is_control = character && (*character < 0x20 || (*character >= 0x7f && *character < 0xa0));
        const std::string_view shown = !character   ? "\xef\xbf\xbd"
                                       : is_control ? " "
                                                    : rest.substr(0, rest.size() - text.size());
        if (printable.size() + shown.size() > kMaxTextBytes - 3) {
            return printable + "…";
        }
        printable += shown;
    }
    return printable;
}

// Secrets are looked for in the whole text, so that none is cut in two.
std::string Shown(std::string_view text) {
    return Printable(media::RedactSecrets(text));
}

// "2026-03-01T08:15:30.123Z recorder[812] error: text", as base/log.h writes it.
std::optional<LoggedError> OurError(std::string_view line) {
    if (!IsPrefix(line, "0000-00-00T00:00:00.000Z ")) {
        return std::nullopt;
    }
    std::tm date = DateAt(line);
    LoggedError error;
    error.time_ms = std::int64_t{::timegm(&date)} * 1000 + NumberAt(line, 20, 3);
    line.remove_prefix(25);
    const std::size_t name_end = std::min(line.find('['), line.size());
    const std::string_view name = line.substr(0, name_end);
    line.remove_prefix(name_end);
    const std::size_t id_end = std::min(line.find_first_not_of("0123456789", 1), line.size());
    constexpr std::string_view kLevel = "] error: ";
    if (name.empty() || name.size() > kMaxNameBytes || name.find_first_not_of(kNameCharacters) != name.npos ||
        id_end < 2 || line.substr(id_end, kLevel.size()) != kLevel) {
        return std::nullopt;
    }
    error.process = name;
    error.text = Shown(line.substr(id_end + kLevel.size()));
    return error;
}

// "2026/03/01 08:15:30 [error] 12#12: *3 text", in the zone of the machine. A request that is quoted loses its query.
std::optional<LoggedError> WebServerError(std::string_view line) {
    constexpr std::string_view kDate = "0000/00/00 00:00:00 ";
    if (!IsPrefix(line, kDate)) {
        return std::nullopt;
    }
    std::tm date = DateAt(line);
    line.remove_prefix(kDate.size());
    for (const std::string_view level : {"[error] ", "[crit] ", "[alert] ", "[emerg] "}) {
        if (line.starts_with(level)) {
            std::string text(line.substr(level.size()));
            for (std::size_t at = text.find('?'); at != text.npos; at = text.find('?', at + 1)) {
                text.erase(at + 1, std::min(text.find_first_of(" \"", at), text.size()) - at - 1);
            }
            return LoggedError{std::int64_t{std::mktime(&date)} * 1000, "web server", Shown(text)};
        }
    }
    return std::nullopt;
}

struct LogFile {
    base::FileDescriptor file;
    std::int64_t size_bytes = 0;
    std::pair<std::int64_t, std::int64_t> changed;  // seconds, nanoseconds
};

// "x.log", and "x.log.1" where it was rotated. Without waiting for a named pipe to be opened at its other end.
std::optional<LogFile> OpenLog(const std::filesystem::path& path) {
    const std::string name = path.filename().string();
    if (!name.ends_with(".log") && !name.ends_with(".log.1")) {
        return std::nullopt;
    }
    LogFile log{base::FileDescriptor(::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC)), 0, {}};
    struct stat status {};
    if (!log.file || ::fstat(log.file.Get(), &status) != 0 || !S_ISREG(status.st_mode) || status.st_nlink != 1) {
        return std::nullopt;
    }
    log.size_bytes = status.st_size;
    log.changed = {status.st_mtim.tv_sec, status.st_mtim.tv_nsec};
    return log;
}

// The end of the file, from the first whole line on.
std::string ReadEnd(const LogFile& log) {
    const std::int64_t begin = std::max<std::int64_t>(0, log.size_bytes - std::int64_t{kMaxFileBytes});
    std::string end(static_cast<std::size_t>(log.size_bytes - begin), '\0');
    end.resize(base::ReadAllAt(log.file.Get(), end.data(), end.size(), static_cast<std::uint64_t>(begin)).value_or(0));
    return begin == 0 ? end : end.substr(std::min(end.find('\n'), end.size()));
}

std::vector<LogFile> NewestLogs(const std::filesystem::path& folder) {
    std::vector<LogFile> logs;
    std::error_code error;
    std::size_t looked_at = 0;
    for (std::filesystem::directory_iterator entry(folder, error), end;
         !error && entry != end && looked_at < kMaxEntries; entry.increment(error), ++looked_at) {
        if (std::optional<LogFile> log = OpenLog(entry->path())) {
            logs.push_back(*std::move(log));
            std::ranges::sort(logs, std::greater<>(), &LogFile::changed);
            logs.resize(std::min(logs.size(), kMaxFiles));
        }
    }
    return logs;
}

}  // namespace

std::vector<LoggedError> ErrorsIn(std::string_view log) {
    std::vector<LoggedError> errors;
    while (!log.empty()) {
        const std::string_view line = log.substr(0, log.find('\n'));
        log.remove_prefix(std::min(line.size() + 1, log.size()));
        std::optional<LoggedError> error = OurError(line);
        if (error || (error = WebServerError(line))) {
            errors.push_back(*std::move(error));
        }
    }
    return errors;
}

LastErrors ReadLastErrors(const std::filesystem::path& log_folder, std::size_t limit) {
    LastErrors last;
    std::vector<LoggedError>& errors = last.newest_first;
    for (const LogFile& log : NewestLogs(log_folder)) {
        last.has_files = true;
        std::vector<LoggedError> found = ErrorsIn(ReadEnd(log));
        std::reverse(found.begin(), found.end());
        for (LoggedError& error : found) {  // a clock that was ahead must not hide what came later
            error.time_ms = std::min(error.time_ms, log.changed.first * 1000 + 999);
        }
        errors.insert(errors.end(), std::make_move_iterator(found.begin()), std::make_move_iterator(found.end()));
        std::ranges::stable_sort(errors, std::greater<>(), &LoggedError::time_ms);
        errors.resize(std::min(errors.size(), limit));
    }
    return last;
}

}  // namespace lookhaven::doctor
