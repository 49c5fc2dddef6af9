// SPDX-License-Identifier: Apache-2.0
//
// The debug-log configuration that all processes of an installation share: who logs how much.
//
// Why so        Detailed logging of a running stream must be switched on and off from outside, so the thresholds are in
//               a mapped file (debug-log in the state folder) that each process looks at for each line.
// Invariants    (1) The layout is fixed: the web API module reads it by its own declaration.
//               (2) A reader never writes; one writer at a time (a lock on the file).
#pragma once

#include <cstdint>

#include <sys/types.h>

#include "standalone/base/file.h"
#include "standalone/base/installation.h"
#include "standalone/control/mapped_table.h"

namespace lookhaven::control {

constexpr int kDebugLogCategoryCount = 512;
constexpr int kDebugLogProcessCount = 256;

// Of what the host logs of requests; the last one, which no module has.
constexpr int kRequestsCategory = kDebugLogCategoryCount - 1;
constexpr int kDebugLevel = 6;

struct DebugLogConfig {
    struct Process {
        std::int32_t pid;
        std::int32_t level;
    };

    std::int32_t version;
    std::int32_t category_level[kDebugLogCategoryCount];  // lines of a level above it are not written
    std::int32_t process_count;                           // entries of process in use
    Process process[kDebugLogProcessCount];
};
static_assert(sizeof(DebugLogConfig) == 2056 + 8 * kDebugLogProcessCount);

// Maps the configuration for reading, for as long as the process lives. Null when there is none, or none that this
// program understands.
const DebugLogConfig* MapDebugLog(const base::Installation& installation);

// Changes the configuration; a new one has threshold 1 (errors) for every category. Holds the writers' lock for its
// lifetime, so a second one waits. Throws std::system_error when the file cannot be created or mapped.
class DebugLogEditor {
  public:
    explicit DebugLogEditor(const base::Installation& installation);

    const DebugLogConfig& Config() const { return *config_; }

    // Throws std::out_of_range for a category below 0 or above the last.
    void SetCategory(int category, int level);
    void SetEveryCategory(int level);

    // Entries of processes that are gone are dropped first. Throws std::length_error when no entry is free.
    void SetProcess(pid_t pid, int level);
    // False when the process had no entry.
    bool RemoveProcess(pid_t pid);

  private:
    base::FileDescriptor lock_;
    MappedTable<DebugLogConfig> config_;
};

}  // namespace lookhaven::control
