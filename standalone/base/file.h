// SPDX-License-Identifier: Apache-2.0
//
// Files and shared mappings, closed and unmapped by their owners' destructors.
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

// Opens the file, creating it if missing, and waits for its exclusive lock (flock), which is held until the descriptor
// is closed. Throws std::system_error.
FileDescriptor LockFile(const std::filesystem::path& path);
// The same without waiting: empty while somebody else has the lock.
FileDescriptor TryLockFile(const std::filesystem::path& path);

// The file's whole contents; throws std::system_error when it cannot be read.
std::string ReadFile(const std::filesystem::path& path);

// Replaces the file in one step, so that a reader sees the old contents or the new; throws std::system_error.
void WriteFileAtomically(const std::filesystem::path& path, std::string_view contents, unsigned int mode = 0600);

// A file mapped shared and writable. Every process that maps the same path sees the same bytes. Unmapped by the
// destructor; the file stays. The constructors throw std::system_error.
class SharedMapping {
  public:
    // Maps the file's first size_bytes bytes; a missing file is created, and a short one filled up with zeros.
    SharedMapping(const std::filesystem::path& path, std::size_t size_bytes, unsigned int mode = 0600);
    // Maps an open file, which must be that long: touching a page behind its end raises SIGBUS.
    SharedMapping(const FileDescriptor& file, std::size_t size_bytes, bool read_only = false);
    SharedMapping(SharedMapping&& other) noexcept;
    SharedMapping& operator=(SharedMapping&& other) noexcept;
    ~SharedMapping();

    void* Data() const { return data_; }
    std::size_t SizeBytes() const { return size_bytes_; }
    // Hands the mapping to the caller, who unmaps it or keeps it until the process ends.
    void* Release();

  private:
    void* data_ = nullptr;
    std::size_t size_bytes_ = 0;
};

}  // namespace lookhaven::base
