// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/common_config.h"

#include <array>
#include <cerrno>
#include <chrono>
#include <filesystem>
#include <memory>
#include <optional>
#include <system_error>
#include <thread>

#include "standalone/base/clock.h"

namespace lookhaven::control {

// The file: the record, and the boot of the machine that it belongs to.
struct CommonConfigFile {
    CommonConfig config;
    std::array<char, 36> boot;
};

namespace {

using Table = MappedTable<CommonConfigFile>;

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "common-config";
}

std::array<char, 36> ThisBoot() {
    std::array<char, 36> boot{};
    base::ReadFile("/proc/sys/kernel/random/boot_id").copy(boot.data(), boot.size());
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

void InitMutex(pthread_mutex_t& mutex) {
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_setpshared(&attributes, PTHREAD_PROCESS_SHARED);
    pthread_mutexattr_setrobust(&attributes, PTHREAD_MUTEX_ROBUST);
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_ERRORCHECK);
    const int error = pthread_mutex_init(&mutex, &attributes);
    pthread_mutexattr_destroy(&attributes);
    if (error != 0) {
        throw std::system_error(error, std::generic_category(), "cannot make the common record's mutex");
    }
}

Table FindOrMakeRecord(const std::filesystem::path& path) {
    const base::FileDescriptor lock = base::LockFile(path.string() + ".lock");
    if (std::optional<Table> table = FindRecord(path)) {
        return *std::move(table);
    }
    return Table::Replace(path, [](CommonConfigFile& file) {
        InitMutex(file.config.mutex);
        file.config.timestamp_sec = MonotonicSeconds();
        file.boot = ThisBoot();
    });
}

struct Unlock {
    void operator()(pthread_mutex_t* mutex) const { pthread_mutex_unlock(mutex); }
};
using Lock = std::unique_ptr<pthread_mutex_t, Unlock>;

// Locks the record's mutex, also one whose owner died. Null after a second: others hold it for a few loads, so one that
// is still held then belongs to a stopped process.
Lock TryLock(pthread_mutex_t& mutex) {
    int error = pthread_mutex_trylock(&mutex);
    for (int tries = 1; error == EBUSY && tries < 1000; ++tries) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
        error = pthread_mutex_trylock(&mutex);
    }
    const bool is_held = error == 0 || (error == EOWNERDEAD && pthread_mutex_consistent(&mutex) == 0);
    return Lock(is_held ? &mutex : nullptr);
}

}  // namespace

CommonConfigKeeper::CommonConfigKeeper(const base::Installation& installation)
    : table_(FindOrMakeRecord(PathOf(installation))) {}

bool CommonConfigKeeper::Refresh(bool paused) {
    CommonConfig& config = table_->config;
    const Lock lock = TryLock(config.mutex);
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

bool IsRecorderAlive(CommonConfig& config, int max_age_sec) {
    const Lock lock = TryLock(config.mutex);
    return lock && MonotonicSeconds() - config.timestamp_sec <= max_age_sec;
}

}  // namespace lookhaven::control
