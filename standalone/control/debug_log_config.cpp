// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/debug_log_config.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <stdexcept>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>

#include "standalone/base/process.h"

namespace lookhaven::control {

namespace {

constexpr std::int32_t kVersion = 1;
constexpr std::int32_t kErrorsOnly = 1;

std::filesystem::path ConfigPath(const base::Installation& installation) {
    return installation.Home() / "debug-log";
}

base::FileDescriptor LockFile(const std::filesystem::path& path) {
    base::FileDescriptor file = base::OpenFile(path, O_RDWR | O_CREAT);
    while (::flock(file.Get(), LOCK_EX) != 0) {
        if (errno != EINTR) {
            base::ThrowErrno("cannot lock " + path.string());
        }
    }
    return file;
}

}  // namespace

const DebugLogConfig* MapDebugLog(const base::Installation& installation) {
    const base::FileDescriptor file(::open(ConfigPath(installation).c_str(), O_RDONLY | O_CLOEXEC));
    struct stat status {};
    if (!file || ::fstat(file.Get(), &status) != 0 || status.st_size < static_cast<off_t>(sizeof(DebugLogConfig))) {
        return nullptr;
    }
    void* data = ::mmap(nullptr, sizeof(DebugLogConfig), PROT_READ, MAP_SHARED, file.Get(), 0);
    if (data == MAP_FAILED) {
        return nullptr;
    }
    const auto* config = static_cast<const DebugLogConfig*>(data);
    if (config->version != kVersion) {
        ::munmap(data, sizeof(DebugLogConfig));
        return nullptr;
    }
    return config;
}

DebugLogEditor::DebugLogEditor(const base::Installation& installation)
    : lock_(LockFile(ConfigPath(installation))),
      mapping_(ConfigPath(installation), sizeof(DebugLogConfig)),
      config_(static_cast<DebugLogConfig*>(mapping_.Data())) {
    if (config_->version != kVersion) {
        config_->process_count = 0;
        SetEveryCategory(kErrorsOnly);
        config_->version = kVersion;
    }
    config_->process_count = std::clamp(config_->process_count, 0, kDebugLogProcessCount);
}

void DebugLogEditor::SetCategory(int category, int level) {
    if (category < 0 || category >= kDebugLogCategoryCount) {
        throw std::out_of_range("log categories have the numbers 0 to " + std::to_string(kDebugLogCategoryCount - 1));
    }
    config_->category_level[category] = level;
}

void DebugLogEditor::SetEveryCategory(int level) {
    std::fill(std::begin(config_->category_level), std::end(config_->category_level), level);
}

// Entries move towards the front before the count shrinks, so that a reader may see one twice but never misses one.
void DebugLogEditor::SetProcess(pid_t pid, int level) {
    DebugLogConfig::Process* end = config_->process + config_->process_count;
    end = std::remove_if(config_->process, end, [pid](const DebugLogConfig::Process& entry) {
        return entry.pid != pid && base::ProcessStartTicks(entry.pid) == 0;
    });
    config_->process_count = static_cast<std::int32_t>(end - config_->process);
    DebugLogConfig::Process* entry =
        std::find_if(config_->process, end, [pid](const auto& known) { return known.pid == pid; });
    if (entry == config_->process + kDebugLogProcessCount) {
        throw std::length_error("at most " + std::to_string(kDebugLogProcessCount) +
                                " processes can have a log level of their own");
    }
    *entry = {pid, level};
    config_->process_count += entry == end ? 1 : 0;
}

bool DebugLogEditor::RemoveProcess(pid_t pid) {
    DebugLogConfig::Process* end = config_->process + config_->process_count;
    DebugLogConfig::Process* rest =
        std::remove_if(config_->process, end, [pid](const auto& entry) { return entry.pid == pid; });
    config_->process_count = static_cast<std::int32_t>(rest - config_->process);
    return rest != end;
}

}  // namespace lookhaven::control
