// SPDX-License-Identifier: Apache-2.0
//
// A tar file compressed by Zstandard, written and read from front to back; what it holds is hashed on the way.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

struct archive;

namespace lookhaven::backup {

// What is read is no backup, or a damaged one.
class Malformed : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

struct FileDigest {
    std::int64_t size_bytes = 0;
    std::string sha256;  // 64 hexadecimal digits

    friend bool operator==(const FileDigest&, const FileDigest&) = default;
};

// The descriptor is the caller's and must outlive this object. Everything throws std::system_error. Without Finish
// the file is cut.
class TarWriter {
  public:
    explicit TarWriter(int descriptor);

    // The file's contents as of now, for which it must not grow or shrink meanwhile.
    FileDigest AddFile(const std::string& name, const std::filesystem::path& path);
    void AddText(const std::string& name, std::string_view text);
    void Finish();

  private:
    void BeginEntry(const std::string& name, std::int64_t size_bytes);
    void Write(const void* data, std::size_t size);

    std::unique_ptr<archive, int (*)(archive*)> archive_;
};

// The descriptor is the caller's and must outlive this object. Everything throws Malformed, also where the file cannot
// be read.
class TarReader {
  public:
    explicit TarReader(int descriptor);

    // The name of the next file; nothing at the end. Anything but a regular file is malformed.
    std::optional<std::string> Next();
    // The contents of the file that Next found; once. Malformed where there are more than max_bytes, the rest of
    // which is not written. Throws std::system_error too, when path exists already or cannot be written.
    FileDigest CopyTo(const std::filesystem::path& path, std::uintmax_t max_bytes);

  private:
    std::unique_ptr<archive, int (*)(archive*)> archive_;
};

}  // namespace lookhaven::backup
