// SPDX-License-Identifier: Apache-2.0
//
// What fuzz targets share: taking their input apart, giving it as a file, and demanding something of the result.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <span>
#include <string>
#include <string_view>

#include <fcntl.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"

namespace lookhaven::fuzz {

// Ends the program, which counts as a crash.
inline void Require(bool condition) {
    if (!condition) {
        std::abort();
    }
}

inline std::string_view Text(std::span<const std::uint8_t> bytes) {
    return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

// Replaces the file's contents.
inline void WriteFile(const std::filesystem::path& path, std::span<const std::uint8_t> bytes) {
    const base::FileDescriptor file = base::OpenFile(path, O_WRONLY | O_CREAT | O_TRUNC);
    Require(base::WriteAll(file.Get(), bytes.data(), bytes.size()));
}

// Takes values and bytes off the front of a target's input.
class Input {
  public:
    Input(const std::uint8_t* data, std::size_t size) : rest_(data, size) {}

    // Bytes that are missing at the end count as zeros.
    template <class Number>
    Number Take() {
        Number number{};
        const std::span<const std::uint8_t> bytes = Take(sizeof(number));
        if (!bytes.empty()) {
            std::memcpy(&number, bytes.data(), bytes.size());
        }
        return number;
    }
    // At most count bytes; fewer at the end.
    std::span<const std::uint8_t> Take(std::size_t count) {
        const std::span<const std::uint8_t> taken = rest_.first(std::min(count, rest_.size()));
        rest_ = rest_.subspan(taken.size());
        return taken;
    }
    // Up to the separator, which goes too, or the end.
    std::string_view TakeUntil(std::string_view separator) {
        const std::string_view text = Text(rest_);
        const std::string_view taken = text.substr(0, text.find(separator));
        Take(taken.size() + separator.size());
        return taken;
    }
    std::span<const std::uint8_t> Rest() const { return rest_; }
    bool IsEmpty() const { return rest_.empty(); }

  private:
    std::span<const std::uint8_t> rest_;
};

}  // namespace lookhaven::fuzz
