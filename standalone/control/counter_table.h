// SPDX-License-Identifier: Apache-2.0
//
// Rows of numbers that one process counts and others read, in a mapped file.
//
// Why so        Numbers that change all the time belong neither in a file that is replaced nor in the store. So they
//               lie in a mapped file, to which their process copies them every second.
// Invariants    A row's numbers may be of two different seconds and, while rows come and go, of two things that are
//               counted; each by itself is whole.
#pragma once

#include <algorithm>
#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <utility>
#include <vector>

#include "standalone/control/mapped_table.h"

namespace lookhaven::control {

// Row is made of atomics, and has Store(const Counters&) and Counters Load() const. kVersion changes with its layout.
template <class Row, std::size_t kMaxRows, std::uint64_t kVersion>
class CounterTable {
  public:
    // Puts an empty table in place of an earlier process's. Throws std::system_error.
    template <class Table>
    static MappedTable<Table> Replace(const std::filesystem::path& path) {
        return MappedTable<Table>::Replace(path, [](Table& table) { table.version_ = kVersion; });
    }

    // Replaces what was written before; what does not fit is left out.
    template <class Counters>
    void Write(const std::vector<Counters>& all) {
        const std::size_t count = std::min(all.size(), kMaxRows);
        for (std::size_t i = 0; i < count; ++i) {
            rows_[i].Store(all[i]);
        }
        used_ = count;
    }

    // Nothing when there is no such file, or one of another version.
    template <class Table>
    static auto Read(const std::filesystem::path& path) {
        using Counters = decltype(std::declval<const Row&>().Load());
        std::optional<std::vector<Counters>> all;
        if (const auto table = MappedTable<const Table>::Open(path); table && (*table)->version_ == kVersion) {
            const auto count = static_cast<std::size_t>(std::min<std::uint64_t>((*table)->used_, kMaxRows));
            all.emplace();
            for (std::size_t i = 0; i < count; ++i) {
                all->push_back((*table)->rows_[i].Load());
            }
        }
        return all;
    }

  private:
    std::atomic<std::uint64_t> version_;
    std::atomic<std::uint64_t> used_;
    std::array<Row, kMaxRows> rows_;
};

}  // namespace lookhaven::control
