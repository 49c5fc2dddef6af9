// SPDX-License-Identifier: Apache-2.0
#include "standalone/control/progress_file.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <stdexcept>
#include <string>
#include <thread>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace lookhaven::control {

namespace {

constexpr std::uint32_t kMagic = 0x4c485031;
constexpr pid_t kSwept = -1;
constexpr int kAttempts = 5;
constexpr std::chrono::milliseconds kPause{1};

std::filesystem::path PathOf(const std::filesystem::path& folder, std::int64_t key) {
    return folder / std::to_string(key);
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
    std::array<char, 64> session;
};

std::optional<base::SharedMapping> ProgressFile::Map(const std::filesystem::path& path) {
    const base::FileDescriptor file(::open(path.c_str(), O_RDWR | O_CLOEXEC | O_NOFOLLOW));
    struct stat status {};
    if (!file || ::fstat(file.Get(), &status) != 0 || status.st_size != static_cast<off_t>(sizeof(Record))) {
        return std::nullopt;
    }
    return base::SharedMapping(file, sizeof(Record));
}

ProgressFile::Record& ProgressFile::Shared() const {
    return *static_cast<Record*>(mapping_.Data());
}

std::optional<ProgressFile> ProgressFile::Open(const std::filesystem::path& folder, std::int64_t key,
                                               std::string_view session) {
    std::optional<base::SharedMapping> mapping = Map(PathOf(folder, key));
    if (!mapping) {
        return std::nullopt;
    }
    const auto& record = *static_cast<const Record*>(mapping->Data());
    const pid_t owner = record.owner;
    if (record.magic != kMagic || owner == kSwept || session != std::string_view(record.session.data())) {
        return std::nullopt;
    }
    return ProgressFile(*std::move(mapping), owner);
}

// Under a name of its own, so that it is linked to the key's name complete.
void ProgressFile::Prepare(const std::filesystem::path& path, std::string_view session) {
    const base::SharedMapping mapping(path, sizeof(Record));
    Record& record = *static_cast<Record*>(mapping.Data());
    if (session.size() >= record.session.size()) {
        throw std::invalid_argument("a session handle is too long");
    }
    record.magic = kMagic;
    record.owner = ::getpid();
    record.value = kUnset;
    record.session.fill('\0');
    session.copy(record.session.data(), session.size());
}

std::optional<ProgressFile> ProgressFile::TakeOver(const std::filesystem::path& path, std::string_view session) {
    std::optional<base::SharedMapping> mapping = Map(path);
    if (!mapping) {
        return std::nullopt;
    }
    Record& record = *static_cast<Record*>(mapping->Data());
    pid_t owner = record.owner;
    if (record.magic != kMagic || owner == kSwept || session != std::string_view(record.session.data()) ||
        !record.owner.compare_exchange_strong(owner, ::getpid())) {
        return std::nullopt;
    }
    record.value = kUnset;
    return ProgressFile(*std::move(mapping), ::getpid());
}

std::optional<ProgressFile> ProgressFile::Own(const std::filesystem::path& folder, std::int64_t key,
                                              std::string_view session) {
    const std::filesystem::path path = PathOf(folder, key);
    std::filesystem::create_directories(folder);
    std::filesystem::path fresh = path;
    fresh += "." + std::to_string(::getpid()) + ".new";
    const Unlinked remove_at_end{fresh};
    Prepare(fresh, session);
    // What keeps the key from being taken over may be its sweeping, which is over in a moment.
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        if (::link(fresh.c_str(), path.c_str()) != 0 && errno != EEXIST) {
            base::ThrowErrno("cannot make " + path.string());
        }
        if (auto file = TakeOver(path, session)) {
            return file;
        }
        std::this_thread::sleep_for(kPause);
    }
    return std::nullopt;
}

void ProgressFile::Sweep(const std::filesystem::path& folder, std::int64_t key, pid_t owner) {
    const std::filesystem::path path = PathOf(folder, key);
    const std::optional<base::SharedMapping> mapping = Map(path);
    if (mapping && static_cast<Record*>(mapping->Data())->owner.compare_exchange_strong(owner, kSwept)) {
        ::unlink(path.c_str());
    }
}

bool ProgressFile::Set(int value) {
    if (!IsCurrent()) {
        return false;
    }
    Shared().value = value;
    return true;
}

bool ProgressFile::IsCurrent() const {
    return Shared().owner == owner_;
}

int ProgressFile::Get() const {
    return IsCurrent() ? Shared().value.load() : kUnset;
}

}  // namespace lookhaven::control
