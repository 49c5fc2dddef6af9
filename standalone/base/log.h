// SPDX-License-Identifier: Apache-2.0
//
// Log lines on standard error, one write each, so that lines of several processes do not interleave; entries with
// fields where standard error is systemd's journal.
#pragma once

#include <string_view>

namespace lookhaven::base {

enum class Severity { kError, kWarning, kInfo, kDebug };

// Names the program in every line that follows. Text must outlive the process; give a literal.
void SetLogProgram(const char* program);

// Lines less severe than this are dropped. kInfo at start.
void SetLogThreshold(Severity threshold);

// What the lines of this thread are about from now on, for the journal; 0 and empty: nothing.
void SetLogCamera(int camera);
void SetLogAccount(std::string_view account);

// Writes "2026-03-01T08:15:30.123Z recorder[812] error: text". Line breaks inside text become spaces. Never throws.
//
// Thread safety: any thread, and a forked child too.
void Log(Severity severity, std::string_view text) noexcept;

// Whether standard error is the journal of systemd, which no file of ours holds.
bool LogsToJournal();

inline void LogError(std::string_view text) noexcept {
    Log(Severity::kError, text);
}
inline void LogWarning(std::string_view text) noexcept {
    Log(Severity::kWarning, text);
}
inline void LogInfo(std::string_view text) noexcept {
    Log(Severity::kInfo, text);
}

}  // namespace lookhaven::base
