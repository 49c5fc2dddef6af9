// SPDX-License-Identifier: Apache-2.0
//
// A folder of a test's own.
#pragma once

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <system_error>

namespace lookhaven::test {

// Empty at first, and removed with all that is in it by the destructor.
class TemporaryFolder {
  public:
    explicit TemporaryFolder(const std::string& name = "lookhaven") {
        std::string pattern = std::filesystem::temp_directory_path() / (name + "-XXXXXX");
        if (::mkdtemp(pattern.data()) == nullptr) {
            throw std::system_error(errno, std::generic_category(), "cannot make " + pattern);
        }
        path_ = pattern;
    }
    TemporaryFolder(const TemporaryFolder&) = delete;
    TemporaryFolder& operator=(const TemporaryFolder&) = delete;
    ~TemporaryFolder() { std::filesystem::remove_all(path_); }

    const std::filesystem::path& Path() const { return path_; }
    operator const std::filesystem::path&() const { return path_; }
    std::filesystem::path operator/(const std::filesystem::path& name) const { return path_ / name; }

  private:
    std::filesystem::path path_;
};

}  // namespace lookhaven::test
