// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/installation.h"

#include <charconv>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/state_folder.h"

namespace lookhaven::base {

namespace {

constexpr const char* kHostFile = "host";

// FNV-1a over device and inode: the same folder under two names is the same installation.
std::uint64_t FolderId(const std::filesystem::path& folder) {
    struct stat status {};
    if (::stat(folder.c_str(), &status) != 0) {
        ThrowErrno("cannot open the state folder " + folder.string());
    }
    std::uint64_t hash = 14695981039346656037ULL;
    for (const std::uint64_t word : {std::uint64_t{status.st_dev}, std::uint64_t{status.st_ino}}) {
        for (unsigned int shift = 0; shift < 64; shift += 8) {
            hash = (hash ^ ((word >> shift) & 0xff)) * 1099511628211ULL;
        }
    }
    return hash;
}

void SyncFolder(const std::filesystem::path& folder) {
    if (::fsync(OpenFile(folder, O_RDONLY | O_DIRECTORY).Get()) != 0) {
        ThrowErrno("cannot write to " + folder.string());
    }
}

}  // namespace

Installation::Installation(const std::filesystem::path& home)
    : home_(std::filesystem::absolute(home).lexically_normal()),
      id_(FolderId(home_)) {}

Installation Installation::FromEnvironment() {
    return Installation(DefaultHome());
}

void Installation::CreateFolders(const std::filesystem::path& home) {
    for (const char* folder : {"", "run", "log", "tls"}) {
        const std::filesystem::path path = home / folder;
        if (std::filesystem::create_directories(path)) {
            std::filesystem::permissions(path, std::filesystem::perms::owner_all);
        }
    }
}

std::string Installation::DefaultStoreUrl() const {
    return "sqlite:" + (home_ / "lookhaven.db").string();
}

std::string Installation::StoreUrl() const {
    const std::filesystem::path override_file = home_ / "store";
    if (std::filesystem::exists(override_file)) {
        std::string url = ReadFile(override_file);
        url.erase(url.find_last_not_of(" \r\n") + 1);
        return url;
    }
    return DefaultStoreUrl();
}

int Installation::HostId() const {
    const std::filesystem::path file = home_ / kHostFile;
    if (!std::filesystem::exists(file)) {
        return 0;
    }
    const std::string text = ReadFile(file);
    int id = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), id);
    if (error != std::errc() || id < 1 || std::string_view(end, text.data() + text.size()) != "\n") {
        throw std::system_error(std::make_error_code(std::errc::invalid_argument),
                                "the file " + file.string() + " does not hold the id of a host");
    }
    return id;
}

void Installation::SetHostId(int id) const {
    const std::filesystem::path file = home_ / kHostFile;
    if (id == 0) {
        std::filesystem::remove(file);
    } else {
        WriteFileAtomically(file, std::to_string(id) + "\n");
    }
    SyncFolder(home_);
}

void Installation::SetStoreUrl(const std::string& url) const {
    const std::filesystem::path override_file = home_ / "store";
    if (url == DefaultStoreUrl()) {
        std::filesystem::remove(override_file);
    } else {
        WriteFileAtomically(override_file, url + "\n");
    }
    // Without this a power cut may bring the other store back.
    SyncFolder(home_);
}

}  // namespace lookhaven::base
