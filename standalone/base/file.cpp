// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/file.h"

#include <array>
#include <cerrno>
#include <optional>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/io.h"

namespace lookhaven::base {

void ThrowErrno(const std::string& what) {
    throw std::system_error(errno, std::generic_category(), what);
}

FileDescriptor OpenFile(const std::filesystem::path& path, int flags, unsigned int mode) {
    FileDescriptor file(::open(path.c_str(), flags | O_CLOEXEC, mode));
    if (!file) {
        ThrowErrno("cannot open " + path.string());
    }
    return file;
}

FileDescriptor LockFile(const std::filesystem::path& path) {
    FileDescriptor file = OpenFile(path, O_RDWR | O_CREAT | O_NOFOLLOW);
    while (::flock(file.Get(), LOCK_EX) != 0) {
        if (errno != EINTR) {
            ThrowErrno("cannot lock " + path.string());
        }
    }
    return file;
}

FileDescriptor TryLockFile(const std::filesystem::path& path) {
    FileDescriptor file = OpenFile(path, O_RDWR | O_CREAT | O_NOFOLLOW);
    if (::flock(file.Get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK) {
            ThrowErrno("cannot lock " + path.string());
        }
        return {};
    }
    return file;
}

std::string ReadFile(const std::filesystem::path& path) {
    const FileDescriptor file = OpenFile(path, O_RDONLY);
    std::string contents;
    std::array<char, 16384> block{};
    for (;;) {
        const std::optional<std::size_t> got = ReadAll(file.Get(), block.data(), block.size());
        if (!got) {
            ThrowErrno("cannot read " + path.string());
        }
        contents.append(block.data(), *got);
        if (*got < block.size()) {
            return contents;
        }
    }
}

namespace {

void WriteWholeFile(const std::filesystem::path& path, std::string_view contents, unsigned int mode) {
    ::unlink(path.c_str());
    const FileDescriptor file = OpenFile(path, O_WRONLY | O_CREAT | O_EXCL, mode);
    if (!WriteAll(file.Get(), contents.data(), contents.size()) || ::fsync(file.Get()) != 0) {
        ThrowErrno("cannot write " + path.string());
    }
}

}  // namespace

void WriteFileAtomically(const std::filesystem::path& path, std::string_view contents, unsigned int mode) {
    std::filesystem::path temporary = path;
    temporary += "." + std::to_string(getpid()) + ".new";
    try {
        WriteWholeFile(temporary, contents, mode);
        std::filesystem::rename(temporary, path);
    } catch (...) {
        ::unlink(temporary.c_str());
        throw;
    }
}

SharedMapping::SharedMapping(const std::filesystem::path& path, std::size_t size_bytes, unsigned int mode)
    : size_bytes_(size_bytes) {
    const FileDescriptor file = OpenFile(path, O_RDWR | O_CREAT | O_NOFOLLOW, mode);
    struct stat status {};
    if (::fstat(file.Get(), &status) != 0) {
        ThrowErrno("cannot stat " + path.string());
    }
    if (!S_ISREG(status.st_mode)) {
        errno = ELOOP;
        ThrowErrno("no regular file: " + path.string());
    }
    // Reserving the blocks now turns a full disk into an error here instead of a bus error later.
    if (status.st_size < static_cast<off_t>(size_bytes)) {
        if (const int error = ::posix_fallocate(file.Get(), 0, static_cast<off_t>(size_bytes)); error != 0) {
            errno = error;
            ThrowErrno("cannot reserve " + path.string());
        }
    }
    *this = SharedMapping(file, size_bytes);
}

SharedMapping::SharedMapping(const FileDescriptor& file, std::size_t size_bytes, bool read_only)
    : size_bytes_(size_bytes) {
    data_ = ::mmap(nullptr, size_bytes, read_only ? PROT_READ : PROT_READ | PROT_WRITE, MAP_SHARED, file.Get(), 0);
    if (data_ == MAP_FAILED) {
        data_ = nullptr;
        ThrowErrno("cannot map a file");
    }
}

SharedMapping::SharedMapping(SharedMapping&& other) noexcept
    : data_(std::exchange(other.data_, nullptr)),
      size_bytes_(other.size_bytes_) {}

SharedMapping& SharedMapping::operator=(SharedMapping&& other) noexcept {
    std::swap(data_, other.data_);
    std::swap(size_bytes_, other.size_bytes_);
    return *this;
}

void* SharedMapping::Release() {
    return std::exchange(data_, nullptr);
}

SharedMapping::~SharedMapping() {
    if (data_ != nullptr) {
        ::munmap(data_, size_bytes_);
    }
}

}  // namespace lookhaven::base
