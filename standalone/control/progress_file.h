// SPDX-License-Identifier: Apache-2.0
//
// One number that a player shares with its client's other requests: a small mapped file for each session and stream
// key.
//
// Why so        Both sides may be killed at any point, and the host sweeps what they leave while a new player takes the
//               same key. So nobody locks: the file holds its owner's process id, which changes by compare and swap.
// Invariants    (1) A file appears under its name complete.
//               (2) Once its owner is kSwept the file is removed, and nobody takes it over any more.
// Thread safety Any process; one thread per object.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string_view>

#include <sys/types.h>

#include "standalone/control/mapped_table.h"

namespace lookhaven::control {

class ProgressFile {
  public:
    static constexpr int kUnset = -1;

    // Makes the calling process the owner of the session's key, with no number set; creates the folder if it is
    // missing. session: its handle, here and below. Nothing when others take and leave the key all the time. Throws
    // std::system_error.
    static std::optional<ProgressFile> Own(const std::filesystem::path& folder, std::int64_t key,
                                           std::string_view session);
    // Nothing when the session has no such key.
    static std::optional<ProgressFile> Open(const std::filesystem::path& folder, std::int64_t key,
                                            std::string_view session);
    // Removes the key's file when the process owns it.
    static void Sweep(const std::filesystem::path& folder, std::int64_t key, std::string_view session, pid_t owner);

    // Both are false for good once the file has another owner than when this object was made.
    bool Set(int value);
    bool IsCurrent() const;
    // kUnset also then.
    int Get() const;

  private:
    struct Record;
    ProgressFile(MappedTable<Record> record, pid_t owner) : record_(std::move(record)), owner_(owner) {}

    static void Prepare(const std::filesystem::path& path);
    bool TakeOver();

    MappedTable<Record> record_;
    pid_t owner_;
};

}  // namespace lookhaven::control
