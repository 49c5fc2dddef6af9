// SPDX-License-Identifier: Apache-2.0
//
// Whole buffers to and from a file: short reads and writes are continued, interrupted calls repeated.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>

namespace lookhaven::base {

// How many bytes were read: fewer than size only at the end of the file. Nothing, with errno set, when reading fails;
// the front of the buffer may be overwritten by then.
std::optional<std::size_t> ReadAll(int descriptor, void* data, std::size_t size);
std::optional<std::size_t> ReadAllAt(int descriptor, void* data, std::size_t size, std::uint64_t offset);

// False, with errno set, when writing fails; some of the data may be written by then.
bool WriteAll(int descriptor, const void* data, std::size_t size);
bool WriteAllAt(int descriptor, const void* data, std::size_t size, std::uint64_t offset);

}  // namespace lookhaven::base
