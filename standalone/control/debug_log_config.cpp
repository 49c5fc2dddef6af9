// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/debug_log_config.h"

#include <algorithm>
#include <iterator>
#include <stdexcept>
#include <system_error>

#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/process.h"

namespace lookhaven::control {

namespace {

constexpr std::int32_t kVersion = 1;
constexpr std::int32_t kErrorsOnly = 1;

std::filesystem::path ConfigPath(const base::Installation& installation) {
    return installation.Home() / "debug-log";
}

// Readers take only a file of the exact size. A shorter one is lengthened when it is mapped.
base::FileDescriptor LockAtSize(const std::filesystem::path& path) {
    base::FileDescriptor file = base::LockFile(path);
    struct stat status {};
    if (::fstat(file.Get(), &status) != 0 ||
        (status.st_size > off_t{sizeof(DebugLogConfig)} && ::ftruncate(file.Get(), sizeof(DebugLogConfig)) != 0)) {
        base::ThrowErrno("cannot cut " + path.string());
    }
    return file;
}

}  // namespace

const DebugLogConfig* MapDebugLog(const base::Installation& installation) try {
    auto table = MappedTable<const DebugLogConfig>::Open(ConfigPath(installation));
    return table && (*table)->version == kVersion ? table->Release() : nullptr;
} catch (const std::system_error&) {
    return nullptr;
}

DebugLogEditor::DebugLogEditor(const base::Installation& installation)
    : lock_(LockAtSize(ConfigPath(installation))),
      config_(MappedTable<DebugLogConfig>::OpenOrCreate(ConfigPath(installation))) {
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
