// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/layout.h"

#include <array>
#include <charconv>
#include <ctime>

#include "standalone/archive/mount_file.h"

namespace lookhaven::archive {

namespace {

constexpr std::array<const char*, 3> kEndings{".mkv", ".index", ".span"};

std::string Format(std::int64_t second, const char* format) {
    std::array<char, 32> text{};
    const std::time_t time = second;
    std::tm utc{};
    gmtime_r(&time, &utc);
    return {text.data(), std::strftime(text.data(), text.size(), format, &utc)};
}

// Parses the digits in front of the stop character and removes both from the text.
template <class T>
bool TakeNumber(std::string_view& text, char stop, T& number) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end == text.data() + text.size() || *end != stop) {
        return false;
    }
    text.remove_prefix(static_cast<std::size_t>(end - text.data()) + 1);
    return true;
}

}  // namespace

std::string DayOf(std::int64_t second) {
    return Format(second, "%Y-%m-%d");
}

std::string PathOf(const FileName& name) {
    return std::to_string(name.camera) + '/' + DayOf(name.start_s) + '/' + Format(name.start_s, "%H%M%S") + '-' +
           std::to_string(name.event) + kEndings.at(static_cast<std::size_t>(name.kind));
}

std::optional<FileName> ParsePath(std::string_view relative_path) {
    FileName name;
    std::tm utc{};
    int time = 0;
    std::string_view rest = relative_path;
    if (!TakeNumber(rest, '/', name.camera) || !TakeNumber(rest, '-', utc.tm_year) ||
        !TakeNumber(rest, '-', utc.tm_mon) || !TakeNumber(rest, '/', utc.tm_mday) || !TakeNumber(rest, '-', time) ||
        !TakeNumber(rest, '.', name.event)) {
        return std::nullopt;
    }
    if (name.camera < 1 || name.event < 1 || utc.tm_year < 1970 || utc.tm_year > 9999) {
        return std::nullopt;
    }
    utc.tm_year -= 1900;
    utc.tm_mon -= 1;
    utc.tm_hour = time / 10000;
    utc.tm_min = time / 100 % 100;
    utc.tm_sec = time % 100;
    name.start_s = timegm(&utc);
    for (const FileKind kind : {FileKind::kRecording, FileKind::kIndex, FileKind::kSpan}) {
        name.kind = kind;
        // Formatted again it must be the same, else a number is out of range or spelled differently.
        if (PathOf(name) == relative_path) {
            return name;
        }
    }
    return std::nullopt;
}

std::filesystem::path IndexPathOf(std::filesystem::path recording) {
    return recording.replace_extension(".index");
}

void MakeFolderFor(const std::filesystem::path& mount, const FileName& name) {
    MakeFolders(mount / std::to_string(name.camera) / DayOf(name.start_s));
}

}  // namespace lookhaven::archive
