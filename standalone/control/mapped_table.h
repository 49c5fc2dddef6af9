// SPDX-License-Identifier: Apache-2.0
//
// A small file that processes map and share: one struct T, all zeros in a new file.
//
// Why so        Processes that share a T may be killed at any point and must not wait for each other, so T has a fixed
//               layout and is changed by atomic operations or under a lock. The file outlives them all: what may have
//               been written by another version or boot is told by T itself.
#pragma once

#include <cstdint>
#include <filesystem>
#include <new>
#include <optional>
#include <stdexcept>
#include <type_traits>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>

#include "standalone/base/file.h"

namespace lookhaven::control {

template <typename T>
class MappedTable {
  public:
    // Maps the file, which is created when missing. Throws std::system_error.
    static MappedTable OpenOrCreate(const std::filesystem::path& path) {
        return MappedTable(base::SharedMapping(path, sizeof(T)));
    }

    // The same for a T with an atomic version, which is set in a new file. Throws std::runtime_error when the file has
    // another one.
    static MappedTable OpenOrCreate(const std::filesystem::path& path, std::uint64_t version) {
        MappedTable table = OpenOrCreate(path);
        std::uint64_t found = 0;
        if (!table->version.compare_exchange_strong(found, version) && found != version) {
            throw std::runtime_error(path.string() + " was made by another version: stop everything and remove it");
        }
        return table;
    }

    // Nothing when the file cannot be opened, is a link, or is not of a T's size. Of a const T the mapping is
    // read-only. Throws std::system_error when mapping fails.
    static std::optional<MappedTable> Open(const std::filesystem::path& path) {
        constexpr bool kReadOnly = std::is_const_v<T>;
        constexpr int kFlags = O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | (kReadOnly ? O_RDONLY : O_RDWR);
        const base::FileDescriptor file(::open(path.c_str(), kFlags));
        struct stat status {};
        if (!file || ::fstat(file.Get(), &status) != 0 || !S_ISREG(status.st_mode) ||
            status.st_size != static_cast<off_t>(sizeof(T))) {
            return std::nullopt;
        }
        return MappedTable(base::SharedMapping(file, sizeof(T), kReadOnly));
    }

    // Puts a new file in place of the one there may be, in one step, once fill(T&) has run. A process that has the old
    // one mapped keeps that. One process at a time. Throws std::system_error.
    template <typename Fill>
    static MappedTable Replace(const std::filesystem::path& path, Fill fill) {
        std::filesystem::path unfinished = path;
        unfinished += ".new";
        std::filesystem::remove(unfinished);
        MappedTable table = OpenOrCreate(unfinished);
        fill(*table);
        std::filesystem::rename(unfinished, path);
        return table;
    }

    T& operator*() const { return *static_cast<T*>(mapping_.Data()); }
    T* operator->() const { return &**this; }

    // Leaves T mapped until the process ends.
    T* Release() { return static_cast<T*>(mapping_.Release()); }

  private:
    explicit MappedTable(base::SharedMapping mapping) : mapping_(std::move(mapping)) {
        static_assert(std::is_standard_layout_v<T> && std::is_trivially_destructible_v<T>);
    }

    base::SharedMapping mapping_;
};

}  // namespace lookhaven::control
