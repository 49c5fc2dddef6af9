// SPDX-License-Identifier: Apache-2.0
//
// Files and mappings as values that clean up after themselves.
#pragma once

#include <cstddef>
#include <filesystem>
#include <string>
#include <string_view>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::base {

// Throws std::system_error of errno with the message "what".
[[noreturn]] void ThrowErrno(const std::string& what);

// open(2) with O_CLOEXEC; throws std::system_error that names the path.
FileDescriptor OpenFile(const std::filesystem::path& path, int flags, unsigned int mode = 0600);

// The file's whole contents; throws std::system_error when it cannot be read.
std::string ReadFile(const std::filesystem::path& path);

// Replaces the file in one step, so that a reader sees the old contents or the new; throws std::system_error.
void WriteFileAtomically(const std::filesystem::path& path, std::string_view contents, unsigned int mode = 0600);

// A file mapped shared and writable, at least size bytes long; created with zeros when missing. Every process that maps
// the same path sees the same bytes. Unmapped by the destructor; the file stays.
class SharedMapping {
  public:
    SharedMapping(const std::filesystem::path& path, std::size_t size_bytes, unsigned int mode = 0600);
    // Of an open file that is long enough.
    SharedMapping(const FileDescriptor& file, std::size_t size_bytes);
    SharedMapping(SharedMapping&& other) noexcept;
    SharedMapping& operator=(SharedMapping&& other) noexcept;
    ~SharedMapping();

    void* Data() const { return data_; }
    std::size_t SizeBytes() const { return size_bytes_; }

  private:
    void* data_ = nullptr;
    std::size_t size_bytes_ = 0;
};

}  // namespace lookhaven::base
