// SPDX-License-Identifier: Apache-2.0
#include "standalone/backup/tar_file.h"

#include <cerrno>
#include <new>
#include <system_error>
#include <vector>

#include <archive.h>
#include <archive_entry.h>
#include <fcntl.h>
#include <sys/stat.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/base/sha256.h"

namespace lookhaven::backup {

namespace {

constexpr std::size_t kBlockBytes = std::size_t{64} << 10U;
constexpr unsigned int kPrivate = 0600;

std::string ReasonOf(archive* from) {
    const char* reason = ::archive_error_string(from);
    return reason == nullptr ? "unknown error" : reason;
}

[[noreturn]] void ThrowUnwritable(archive* to) {
    const int error = ::archive_errno(to);
    throw std::system_error(error > 0 ? error : EIO, std::generic_category(), "cannot write the backup");
}

}  // namespace

TarWriter::TarWriter(int descriptor) : archive_(::archive_write_new(), ::archive_write_free) {
    if (!archive_) {
        throw std::bad_alloc();
    }
    if (::archive_write_set_format_pax_restricted(archive_.get()) != ARCHIVE_OK ||
        ::archive_write_add_filter_zstd(archive_.get()) != ARCHIVE_OK ||
        ::archive_write_open_fd(archive_.get(), descriptor) != ARCHIVE_OK) {
        ThrowUnwritable(archive_.get());
    }
}

void TarWriter::BeginEntry(const std::string& name, std::int64_t size_bytes) {
    const std::unique_ptr<archive_entry, void (*)(archive_entry*)> entry(::archive_entry_new(), ::archive_entry_free);
    if (!entry) {
        throw std::bad_alloc();
    }
    ::archive_entry_set_pathname(entry.get(), name.c_str());
    ::archive_entry_set_size(entry.get(), size_bytes);
    ::archive_entry_set_filetype(entry.get(), AE_IFREG);
    ::archive_entry_set_perm(entry.get(), kPrivate);
    if (::archive_write_header(archive_.get(), entry.get()) != ARCHIVE_OK) {
        ThrowUnwritable(archive_.get());
    }
}

void TarWriter::Write(const void* data, std::size_t size) {
    if (::archive_write_data(archive_.get(), data, size) != static_cast<la_ssize_t>(size)) {
        ThrowUnwritable(archive_.get());
    }
}

FileDigest TarWriter::AddFile(const std::string& name, const std::filesystem::path& path) {
    const base::FileDescriptor file = base::OpenFile(path, O_RDONLY | O_NOFOLLOW | O_NONBLOCK);
    struct stat about {};
    if (::fstat(file.Get(), &about) != 0 || !S_ISREG(about.st_mode)) {
        throw std::system_error(EINVAL, std::generic_category(), path.string() + " is not a regular file");
    }
    BeginEntry(name, about.st_size);
    base::Sha256 hash;
    std::int64_t size_bytes = 0;
    std::vector<char> block(kBlockBytes);
    for (std::size_t count = block.size(); count == block.size();) {
        const std::optional<std::size_t> read = base::ReadAll(file.Get(), block.data(), block.size());
        if (!read) {
            base::ThrowErrno("cannot read " + path.string());
        }
        count = *read;
        Write(block.data(), count);
        hash.Add(block.data(), count);
        size_bytes += static_cast<std::int64_t>(count);
    }
    return {size_bytes, hash.Finish()};
}

void TarWriter::AddText(const std::string& name, std::string_view text) {
    BeginEntry(name, static_cast<std::int64_t>(text.size()));
    Write(text.data(), text.size());
}

void TarWriter::Finish() {
    if (::archive_write_close(archive_.get()) != ARCHIVE_OK) {
        ThrowUnwritable(archive_.get());
    }
}

TarReader::TarReader(int descriptor) : archive_(::archive_read_new(), ::archive_read_free) {
    if (!archive_) {
        throw std::bad_alloc();
    }
    if (::archive_read_support_filter_zstd(archive_.get()) != ARCHIVE_OK ||
        ::archive_read_support_format_tar(archive_.get()) != ARCHIVE_OK ||
        ::archive_read_open_fd(archive_.get(), descriptor, kBlockBytes) != ARCHIVE_OK) {
        throw Malformed("this is not a backup: " + ReasonOf(archive_.get()));
    }
}

std::optional<std::string> TarReader::Next() {
    archive_entry* entry = nullptr;
    const int result = ::archive_read_next_header(archive_.get(), &entry);
    if (result == ARCHIVE_EOF) {
        return std::nullopt;
    }
    if (result != ARCHIVE_OK) {
        throw Malformed("the backup is damaged: " + ReasonOf(archive_.get()));
    }
    const char* name = ::archive_entry_pathname(entry);
    if (name == nullptr || ::archive_entry_filetype(entry) != AE_IFREG || ::archive_entry_hardlink(entry) != nullptr) {
        throw Malformed("the backup holds something other than files");
    }
    return name;
}

FileDigest TarReader::CopyTo(const std::filesystem::path& path, std::uintmax_t max_bytes) {
    const base::FileDescriptor file = base::OpenFile(path, O_WRONLY | O_CREAT | O_EXCL, kPrivate);
    base::Sha256 hash;
    std::uintmax_t bytes = 0;
    std::vector<char> block(kBlockBytes);
    for (;;) {
        const la_ssize_t count = ::archive_read_data(archive_.get(), block.data(), block.size());
        if (count < 0) {
            throw Malformed("the backup is damaged: " + ReasonOf(archive_.get()));
        }
        if (count == 0) {
            return {static_cast<std::int64_t>(bytes), hash.Finish()};
        }
        bytes += static_cast<std::uintmax_t>(count);
        if (bytes > max_bytes) {
            throw Malformed("the backup holds a file that is too large");
        }
        hash.Add(block.data(), static_cast<std::size_t>(count));
        if (!base::WriteAll(file.Get(), block.data(), static_cast<std::size_t>(count))) {
            base::ThrowErrno("cannot write " + path.string());
        }
    }
}

}  // namespace lookhaven::backup
