// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/mount_file.h"

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <optional>
#include <system_error>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"

namespace lookhaven::archive {

namespace {

bool IsDigit(char c) {
    return std::isdigit(static_cast<unsigned char>(c)) != 0;
}

bool IsCameraFolder(const std::string& name) {
    return !name.empty() && std::ranges::all_of(name, IsDigit);
}

bool IsDayFolder(const std::string& name) {  // 2026-03-01
    constexpr std::string_view kForm = "dddd-dd-dd";
    return std::ranges::equal(name, kForm, [](char c, char form) { return form == 'd' ? IsDigit(c) : c == form; });
}

// Opens the folder, which is below the mount as far as its name says so, and makes the last missing_ok of its steps.
base::FileDescriptor OpenFolder(std::filesystem::path folder, std::size_t missing_ok) {
    const std::filesystem::path whole = folder;
    std::vector<std::string> steps;
    if (IsDayFolder(folder.filename())) {
        steps.push_back(folder.filename());
        folder = folder.parent_path();
        if (IsCameraFolder(folder.filename())) {
            steps.push_back(folder.filename());
            folder = folder.parent_path();
        }
    }
    base::FileDescriptor at = base::OpenFile(folder.empty() ? "." : folder, O_PATH | O_DIRECTORY);
    for (; !steps.empty(); steps.pop_back()) {
        const char* step = steps.back().c_str();
        if (steps.size() <= missing_ok && ::mkdirat(at.Get(), step, 0777) != 0 && errno != EEXIST) {
            base::ThrowErrno("cannot make the folder " + whole.string());
        }
        base::FileDescriptor next(::openat(at.Get(), step, O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
        struct stat status {};
        // ENOTDIR would mean that there is no such folder.
        if (!next && errno == ENOTDIR && ::fstatat(at.Get(), step, &status, AT_SYMLINK_NOFOLLOW) == 0) {
            errno = S_ISLNK(status.st_mode) ? ELOOP : ENOTDIR;
        }
        at = std::move(next);
        if (!at) {
            base::ThrowErrno("cannot open the folder " + whole.string());
        }
    }
    return at;
}

base::FileDescriptor OpenIn(const base::FileDescriptor& folder, const std::filesystem::path& path, int flags,
                            unsigned int mode) {
    // A pipe opens at once, or not at all, without blocking; regular files do not know the flag.
    constexpr int kAlways = O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
    base::FileDescriptor file(::openat(folder.Get(), path.filename().c_str(), flags | kAlways, mode));
    struct stat status {};
    if (!file || ::fstat(file.Get(), &status) != 0) {
        base::ThrowErrno("cannot open " + path.string());
    }
    if (!S_ISREG(status.st_mode)) {
        errno = ELOOP;
        base::ThrowErrno("no regular file: " + path.string());
    }
    return file;
}

}  // namespace

base::FileDescriptor OpenFile(const std::filesystem::path& path, int flags, unsigned int mode) {
    return OpenIn(OpenFolder(path.parent_path(), 0), path, flags, mode);
}

base::FileDescriptor OpenFileInNewDay(const std::filesystem::path& path, int flags, unsigned int mode) {
    return OpenIn(OpenFolder(path.parent_path(), 1), path, flags, mode);
}

std::uint64_t SizeOf(const base::FileDescriptor& file, const std::filesystem::path& path) {
    struct stat status {};
    if (::fstat(file.Get(), &status) != 0) {
        base::ThrowErrno("cannot read " + path.string());
    }
    return static_cast<std::uint64_t>(status.st_size);
}

std::string ReadFile(const std::filesystem::path& path, std::size_t max_bytes) {
    const base::FileDescriptor file = OpenFile(path, O_RDONLY);
    std::string contents(static_cast<std::size_t>(std::min<std::uint64_t>(SizeOf(file, path), max_bytes)), '\0');
    const std::optional<std::size_t> got = base::ReadAll(file.Get(), contents.data(), contents.size());
    if (!got) {
        base::ThrowErrno("cannot read " + path.string());
    }
    contents.resize(*got);
    return contents;
}

void WriteFileAtomically(const std::filesystem::path& path, std::string_view contents, unsigned int mode) {
    std::filesystem::path temporary = path;
    temporary += "." + std::to_string(::getpid()) + ".new";
    RemoveFile(temporary);
    try {
        const base::FileDescriptor file = OpenFile(temporary, O_WRONLY | O_CREAT | O_EXCL, mode);
        if (!base::WriteAll(file.Get(), contents.data(), contents.size()) || ::fsync(file.Get()) != 0) {
            base::ThrowErrno("cannot write " + path.string());
        }
        RenameFile(temporary, path.filename());
    } catch (...) {
        RemoveFile(temporary);
        throw;
    }
}

void RenameFile(const std::filesystem::path& path, const std::string& name) {
    const base::FileDescriptor folder = OpenFolder(path.parent_path(), 0);
    if (::renameat(folder.Get(), path.filename().c_str(), folder.Get(), name.c_str()) != 0) {
        base::ThrowErrno("cannot rename " + path.string());
    }
}

bool RemoveFile(const std::filesystem::path& path) noexcept try {
    const base::FileDescriptor folder = OpenFolder(path.parent_path(), 0);
    return ::unlinkat(folder.Get(), path.filename().c_str(), 0) == 0;
} catch (const std::exception&) {
    return false;
}

void MakeFolders(const std::filesystem::path& folder) {
    OpenFolder(folder, 2);
}

}  // namespace lookhaven::archive
