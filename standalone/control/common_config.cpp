// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/common_config.h"

#include <array>
#include <cerrno>
#include <chrono>
#include <filesystem>
#include <new>
#include <system_error>
#include <thread>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>

#include "standalone/base/clock.h"

namespace lookhaven::control {

namespace {

using BootId = std::array<char, 36>;

// The file: the record, and which boot of the machine made it.
struct RecordFile {
    CommonConfig config;
    BootId boot;
};

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "common-config";
}

BootId ThisBoot() {
    BootId boot{};
    base::ReadFile("/proc/sys/kernel/random/boot_id").copy(boot.data(), boot.size());
    return boot;
}

std::int64_t MonotonicSeconds() {
    return base::MonotonicMicros() / 1'000'000;
}

// The file has our size and this boot's mark. It is only ever replaced whole, so what was true stays true.
bool IsUsable(const std::filesystem::path& path) {
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0 || status.st_size != static_cast<off_t>(sizeof(RecordFile))) {
        return false;
    }
    const base::SharedMapping mapping(path, sizeof(RecordFile));
    return static_cast<const RecordFile*>(mapping.Data())->boot == ThisBoot();
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

void MakeRecord(const std::filesystem::path& path) {
    std::filesystem::path unfinished = path;
    unfinished += ".new";
    std::filesystem::remove(unfinished);
    {
        const base::SharedMapping mapping(unfinished, sizeof(RecordFile));
        auto& file = *new (mapping.Data()) RecordFile{};
        InitMutex(file.config.mutex);
        file.config.timestamp_sec = MonotonicSeconds();
        file.boot = ThisBoot();
    }
    std::filesystem::rename(unfinished, path);
}

base::SharedMapping MapOrMake(const base::Installation& installation) {
    const std::filesystem::path path = PathOf(installation);
    const base::FileDescriptor lock = base::OpenFile(path.string() + ".lock", O_RDWR | O_CREAT);
    while (::flock(lock.Get(), LOCK_EX) != 0) {
        if (errno != EINTR) {
            base::ThrowErrno("cannot lock " + path.string());
        }
    }
    if (!IsUsable(path)) {
        MakeRecord(path);
    }
    return base::SharedMapping(path, sizeof(RecordFile));
}

// Holds the record's lock, taken over from a dead owner if need be. Tried for a second: others hold it for a few loads, so
// one that is still held then belongs to a stopped process.
class Lock {
  public:
    explicit Lock(pthread_mutex_t& mutex) : mutex_(mutex) {
        for (int tries = 0; tries < 1000; ++tries) {
            const int error = pthread_mutex_trylock(&mutex);
            if (error == EBUSY) {
                std::this_thread::sleep_for(std::chrono::milliseconds(1));
                continue;
            }
            held_ = error == 0 || (error == EOWNERDEAD && pthread_mutex_consistent(&mutex) == 0);
            return;
        }
    }
    ~Lock() {
        if (held_) {
            pthread_mutex_unlock(&mutex_);
        }
    }
    Lock(const Lock&) = delete;
    Lock& operator=(const Lock&) = delete;

    explicit operator bool() const { return held_; }

  private:
    pthread_mutex_t& mutex_;
    bool held_ = false;
};

}  // namespace

CommonConfigKeeper::CommonConfigKeeper(const base::Installation& installation) : mapping_(MapOrMake(installation)) {}

bool CommonConfigKeeper::Refresh(bool paused) {
    CommonConfig& config = static_cast<RecordFile*>(mapping_.Data())->config;
    const Lock lock(config.mutex);
    if (!lock) {
        return false;
    }
    config.timestamp_sec = MonotonicSeconds();
    config.paused = paused ? 1 : 0;
    return true;
}

CommonConfig* MapCommonConfig(const base::Installation& installation) try {
    if (!IsUsable(PathOf(installation))) {
        return nullptr;
    }
    // Left mapped on purpose: readers keep the pointer until they end.
    static_assert(sizeof(RecordFile) <= 4096);
    const base::FileDescriptor file = base::OpenFile(PathOf(installation), O_RDWR);
    void* address = ::mmap(nullptr, sizeof(RecordFile), PROT_READ | PROT_WRITE, MAP_SHARED, file.Get(), 0);
    return address == MAP_FAILED ? nullptr : &static_cast<RecordFile*>(address)->config;
} catch (const std::system_error&) {
    return nullptr;
}

bool IsRecorderAlive(CommonConfig& config, int max_age_sec) {
    const Lock lock(config.mutex);
    return lock && MonotonicSeconds() - config.timestamp_sec <= max_age_sec;
}

}  // namespace lookhaven::control
