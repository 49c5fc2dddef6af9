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
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "standalone/base/log.h"
#include "standalone/control/mapped_table.h"

namespace lookhaven::control {

// Row is made of atomics, and has Store(const Counters&) and Counters Load() const. kVersion changes with its layout.
template <class Row, std::size_t kMaxRows, std::uint64_t kVersion>
class CounterTable {
  public:
    // Nothing has been written yet.
    void Begin() { version_ = kVersion; }

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

// The counting process's side of a Table, which is a CounterTable. A process whose table cannot be made says so once
// and works without it. Write tries again, after a second at first and once a minute in the end: it waits for the disk
// then.
template <class Table>
class CounterTableWriter {
  public:
    // Puts an empty table in place of an earlier process's.
    explicit CounterTableWriter(std::filesystem::path path) : path_(std::move(path)) { Replace(); }

    template <class Counters>
    void Write(const std::vector<Counters>& all) {
        if (!table_ && std::chrono::steady_clock::now() >= next_attempt_) {
            Replace();
        }
        if (table_) {
            (*table_)->Write(all);
        }
    }

  private:
    void Replace() {
        try {
            table_.emplace(MappedTable<Table>::Replace(path_, [](Table& table) { table.Begin(); }));
            if (pause_.count() > 0) {
                base::LogInfo("the table of counts " + path_.string() + " works again");
            }
        } catch (const std::exception& failure) {
            std::error_code ignored;
            std::filesystem::remove(path_, ignored);  // an earlier process's numbers are not this one's
            if (pause_.count() == 0) {
                base::LogError(
                    std::string(
                        "cannot create a table of counts, which is tried again; monitoring lacks them until then: ") +
                    failure.what());
            }
            pause_ = std::clamp<std::chrono::seconds>(2 * pause_, std::chrono::seconds(1), std::chrono::seconds(60));
            next_attempt_ = std::chrono::steady_clock::now() + pause_;
        }
    }

    const std::filesystem::path path_;
    std::optional<MappedTable<Table>> table_;
    std::chrono::seconds pause_{0};  // after the last failure; 0: there was none
    std::chrono::steady_clock::time_point next_attempt_;
};

}  // namespace lookhaven::control
