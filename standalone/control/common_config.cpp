// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/common_config.h"

#include <array>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <system_error>

#include <sys/mman.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/process.h"
#include "standalone/control/shared_mutex.h"

namespace lookhaven::control {

// The file: the record, the boot of the machine that it belongs to, and the recorder that refreshes it.
struct CommonConfigFile {
    CommonConfig config;
    std::array<char, 32> boot;
    base::ProcessIdentity recorder;
};

namespace {

using Table = MappedTable<CommonConfigFile>;

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "common-config";
}

std::array<char, 32> ThisBoot() {
    std::array<char, 32> boot{};
    base::BootId().copy(boot.data(), boot.size());
    return boot;
}

std::int64_t MonotonicSeconds() {
    return base::MonotonicMicros() / 1'000'000;
}

// Nothing when there is none of this boot. The file is only ever replaced whole, so a record once found stays good.
std::optional<Table> FindRecord(const std::filesystem::path& path) {
    std::optional<Table> table = Table::Open(path);
    return table && (*table)->boot == ThisBoot() ? std::move(table) : std::nullopt;
}

Table FindOrMakeRecord(const std::filesystem::path& path) {
    const base::FileDescriptor lock = base::LockFile(path.string() + ".lock");
    if (std::optional<Table> table = FindRecord(path)) {
        return *std::move(table);
    }
    return Table::Replace(path, [](CommonConfigFile& file) {
        InitSharedMutex(file.config.mutex);
        file.config.timestamp_sec = MonotonicSeconds();
        file.boot = ThisBoot();
    });
}

}  // namespace

CommonConfigKeeper::CommonConfigKeeper(const base::Installation& installation)
    : table_(FindOrMakeRecord(PathOf(installation))) {
    table_->recorder = base::ThisProcess();
}

bool CommonConfigKeeper::Refresh(bool paused) {
    CommonConfig& config = table_->config;
    const SharedLock lock = TryLock(config.mutex);
    if (!lock) {
        return false;
    }
    config.timestamp_sec = MonotonicSeconds();
    config.paused = paused ? 1 : 0;
    return true;
}

CommonConfig* MapCommonConfig(const base::Installation& installation) try {
    std::optional<Table> table = FindRecord(PathOf(installation));
    return table ? &table->Release()->config : nullptr;
} catch (const std::system_error&) {
    return nullptr;
}

// It lies at the beginning of a mapping of less than a page.
void UnmapCommonConfig(CommonConfig* config) {
    const auto address = reinterpret_cast<std::uintptr_t>(config);
    const std::uintptr_t page = static_cast<std::uintptr_t>(::sysconf(_SC_PAGESIZE));
    ::munmap(reinterpret_cast<void*>(address & ~(page - 1)), sizeof(CommonConfigFile));
}

RecorderState FindRecorder(const base::Installation& installation) try {
    const std::optional<Table> table = FindRecord(PathOf(installation));
    if (table && IsRecorderAlive((*table)->config)) {
        return RecorderState::kAlive;
    }
    return table && base::IsAlive((*table)->recorder) ? RecorderState::kHangs : RecorderState::kNone;
} catch (const std::system_error&) {
    return RecorderState::kNone;
}

std::optional<base::ProcessIdentity> RecorderProcess(const base::Installation& installation) try {
    const std::optional<Table> table = FindRecord(PathOf(installation));
    return table && base::IsAlive((*table)->recorder) ? std::optional((*table)->recorder) : std::nullopt;
} catch (const std::system_error&) {
    return std::nullopt;
}

bool IsRecorderAlive(CommonConfig& config, int max_age_sec) {
    const SharedLock lock = TryLock(config.mutex);
    return lock && MonotonicSeconds() - config.timestamp_sec <= max_age_sec;
}

}  // namespace lookhaven::control
