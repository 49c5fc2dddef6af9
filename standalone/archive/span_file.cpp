// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/span_file.h"

#include <charconv>
#include <optional>
#include <string_view>

#include "standalone/archive/layout.h"
#include "standalone/archive/mount_file.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

namespace {

constexpr std::string_view kFirstLine = "lookhaven span 1";
constexpr std::size_t kMaxBytes = 128 * kMaxSpanRecordings;

// Removes the next line and returns what follows the word; nothing when the line begins otherwise or is incomplete.
std::optional<std::string_view> TakeLine(std::string_view& text, std::string_view word) {
    const std::size_t end = text.find('\n');
    if (end == std::string_view::npos || !text.starts_with(word)) {
        return std::nullopt;
    }
    const std::string_view value = text.substr(word.size(), end - word.size());
    text.remove_prefix(end + 1);
    return value;
}

bool TakeTime(std::string_view& text, std::string_view word, std::int64_t& time_ms) {
    const auto value = TakeLine(text, word);
    return value &&
           std::from_chars(value->data(), value->data() + value->size(), time_ms).ptr == value->data() + value->size();
}

bool IsRecording(std::string_view path) {
    const auto name = ParsePath("1/" + std::string(path));
    return name && name->kind == FileKind::kRecording;
}

Span Parse(std::string_view text, const std::string& path) {
    Span span;
    if (TakeLine(text, kFirstLine) != std::string_view() || !TakeTime(text, "begin ", span.begin_ms) ||
        !TakeTime(text, "end ", span.end_ms)) {
        throw ArchiveError(path + " is not a span of recordings");
    }
    if (span.begin_ms < 0 || span.end_ms < span.begin_ms ||
        span.end_ms - span.begin_ms > std::int64_t{base::kMaxRecordingSeconds} * 1000) {
        throw ArchiveError(path + " names an impossible time");
    }
    while (!text.empty()) {
        const auto recording = TakeLine(text, "recording ");
        if (!recording || !IsRecording(*recording) || span.recordings.size() == kMaxSpanRecordings) {
            throw ArchiveError(path + " names something that is not a recording");
        }
        span.recordings.emplace_back(*recording);
    }
    return span;
}

}  // namespace

void WriteSpan(const std::filesystem::path& path, const Span& span) {
    std::string text(kFirstLine);
    text += "\nbegin " + std::to_string(span.begin_ms) + "\nend " + std::to_string(span.end_ms) + '\n';
    for (const std::string& recording : span.recordings) {
        text += "recording " + recording + '\n';
    }
    Parse(text, path.string());
    WriteFileAtomically(path, text);
}

Span ReadSpan(const std::filesystem::path& path) {
    const std::string text = ReadFile(path, kMaxBytes + 1);
    if (text.size() > kMaxBytes) {
        throw ArchiveError(path.string() + " is too long for a list of recordings");
    }
    return Parse(text, path.string());
}

}  // namespace lookhaven::archive
