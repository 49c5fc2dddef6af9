// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/progress_file.h"

#include <atomic>
#include <cerrno>
#include <chrono>
#include <stdexcept>
#include <string>
#include <thread>

#include <unistd.h>

#include "standalone/base/text.h"

namespace lookhaven::control {

namespace {

constexpr std::uint32_t kMagic = 0x4c485031;
constexpr pid_t kSwept = -1;
constexpr int kAttempts = 5;
constexpr std::chrono::milliseconds kPause{1};

// Throws std::invalid_argument for what is no session's handle: a process that was taken over may have left anything.
std::filesystem::path PathOf(const std::filesystem::path& folder, std::int64_t key, std::string_view session) {
    if (!base::IsHex(session, session.size())) {
        throw std::invalid_argument("no session has this handle");
    }
    return folder / std::to_string(key).append(".").append(session);
}

struct Unlinked {
    const std::filesystem::path& path;
    ~Unlinked() { ::unlink(path.c_str()); }
};

}  // namespace

struct ProgressFile::Record {
    std::uint32_t magic;
    std::atomic<pid_t> owner;
    std::atomic<int> value;
};

std::optional<ProgressFile> ProgressFile::Open(const std::filesystem::path& folder, std::int64_t key,
                                               std::string_view session) {
    std::optional<MappedTable<Record>> record = MappedTable<Record>::Open(PathOf(folder, key, session));
    if (!record) {
        return std::nullopt;
    }
    const pid_t owner = (*record)->owner;
    if ((*record)->magic != kMagic || owner == kSwept) {
        return std::nullopt;
    }
    return ProgressFile(*std::move(record), owner);
}

// Makes the file under a name of its own, to be linked to the key's name once complete.
void ProgressFile::Prepare(const std::filesystem::path& path) {
    const auto table = MappedTable<Record>::OpenOrCreate(path);
    table->magic = kMagic;
    table->owner = ::getpid();
    table->value = kUnset;
}

bool ProgressFile::TakeOver() {
    if (!record_->owner.compare_exchange_strong(owner_, ::getpid())) {
        return false;
    }
    owner_ = ::getpid();
    record_->value = kUnset;
    return true;
}

std::optional<ProgressFile> ProgressFile::Own(const std::filesystem::path& folder, std::int64_t key,
                                              std::string_view session) {
    const std::filesystem::path path = PathOf(folder, key, session);
    std::filesystem::create_directories(folder);
    std::filesystem::path fresh = path;
    fresh += "." + std::to_string(::getpid()) + ".new";
    const Unlinked remove_at_end{fresh};
    Prepare(fresh);
    // The key may just be swept, which is over in a moment.
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        if (::link(fresh.c_str(), path.c_str()) != 0 && errno != EEXIST) {
            base::ThrowErrno("cannot make " + path.string());
        }
        if (auto file = Open(folder, key, session); file && file->TakeOver()) {
            return file;
        }
        std::this_thread::sleep_for(kPause);
    }
    return std::nullopt;
}

void ProgressFile::Sweep(const std::filesystem::path& folder, std::int64_t key, std::string_view session, pid_t owner) {
    const std::filesystem::path path = PathOf(folder, key, session);
    const auto record = MappedTable<Record>::Open(path);
    if (record && (*record)->owner.compare_exchange_strong(owner, kSwept)) {
        ::unlink(path.c_str());
    }
}

bool ProgressFile::Set(int value) {
    if (!IsCurrent()) {
        return false;
    }
    record_->value = value;
    return true;
}

bool ProgressFile::IsCurrent() const {
    return record_->owner == owner_;
}

int ProgressFile::Get() const {
    return IsCurrent() ? record_->value.load() : kUnset;
}

}  // namespace lookhaven::control
