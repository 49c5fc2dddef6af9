// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/mount_counters.h"

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

    void Store(const MountCounters& from) {
        mount = from.mount;
        retention_runs = from.retention_runs;
        retention_failures = from.retention_failures;
        deleted_events = from.deleted_events;
        deleted_bytes = from.deleted_bytes;
    }

    MountCounters Load() const { return {mount, retention_runs, retention_failures, deleted_events, deleted_bytes}; }
};

}  // namespace

struct MountCountersWriter::Table : CounterTable<Row, kMaxMounts, kVersion> {};

MountCountersWriter::MountCountersWriter(const base::Installation& installation) : table_(PathOf(installation)) {}

void MountCountersWriter::Write(const std::vector<MountCounters>& mounts) {
    table_.Write(mounts);
}

std::vector<MountCounters> ReadMountCounters(const base::Installation& installation) {
    return MountCountersWriter::Table::Read<MountCountersWriter::Table>(PathOf(installation))
        .value_or(std::vector<MountCounters>());
}

}  // namespace lookhaven::control
