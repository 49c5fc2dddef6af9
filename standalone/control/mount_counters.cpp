// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/mount_counters.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <filesystem>

namespace lookhaven::control {

namespace {

constexpr std::uint64_t kVersion = 0x6c68'6d74'6301;  // with the layout
constexpr std::size_t kMaxMounts = 256;

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "mount-counters";
}

struct Row {
    std::atomic<std::int32_t> mount;
    std::atomic<std::uint64_t> retention_runs;
    std::atomic<std::uint64_t> retention_failures;
    std::atomic<std::uint64_t> deleted_events;
    std::atomic<std::uint64_t> deleted_bytes;
};

}  // namespace

struct MountCountersWriter::Table {
    std::atomic<std::uint64_t> version;
    std::atomic<std::uint64_t> used;
    std::array<Row, kMaxMounts> rows;
};

MountCountersWriter::MountCountersWriter(const base::Installation& installation)
    : table_(MappedTable<Table>::Replace(PathOf(installation), [](Table& table) { table.version = kVersion; })) {}

void MountCountersWriter::Write(const std::vector<MountCounters>& mounts) {
    const std::size_t count = std::min(mounts.size(), kMaxMounts);
    for (std::size_t i = 0; i < count; ++i) {
        Row& row = table_->rows[i];
        row.mount = mounts[i].mount;
        row.retention_runs = mounts[i].retention_runs;
        row.retention_failures = mounts[i].retention_failures;
        row.deleted_events = mounts[i].deleted_events;
        row.deleted_bytes = mounts[i].deleted_bytes;
    }
    table_->used = count;
}

std::vector<MountCounters> ReadMountCounters(const base::Installation& installation) {
    const auto table = MappedTable<const MountCountersWriter::Table>::Open(PathOf(installation));
    std::vector<MountCounters> mounts;
    if (!table || (*table)->version != kVersion) {
        return mounts;
    }
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>((*table)->used, kMaxMounts));
    for (std::size_t i = 0; i < count; ++i) {
        const Row& row = (*table)->rows[i];
        mounts.push_back(
            {row.mount, row.retention_runs, row.retention_failures, row.deleted_events, row.deleted_bytes});
    }
    return mounts;
}

}  // namespace lookhaven::control
