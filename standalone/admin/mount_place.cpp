// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/mount_place.h"

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <system_error>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/mounts.h"
#include "standalone/store/settings.h"

namespace lookhaven::admin {

namespace {

namespace fs = std::filesystem;

constexpr int kStepFlags = O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;

[[noreturn]] void Refuse(const std::string& path, const std::string& why) {
    throw store::InvalidRecord("the folder " + path + " cannot be a mount: " + why);
}

bool IsPlain(const std::string& path) {
    return path.starts_with('/') && path.back() != '/' && fs::path(path).lexically_normal().native() == path;
}

bool IsBelow(const std::string& path, const std::string& folder) {
    return folder.size() > 1 && path.starts_with(folder + "/");
}

void RequireAllowed(store::Store& store, const std::string& path) {
    const std::string allowed = store::Settings(store).Find(store::kMountFoldersSetting).value_or(store::kMountFolders);
    for (std::size_t at = 0; at < allowed.size();) {
        const std::size_t end = std::min(allowed.find(':', at), allowed.size());
        if (IsPlain(path) && IsBelow(path, allowed.substr(at, end - at))) {
            return;
        }
        at = end + 1;
    }
    Refuse(path, "mounts can be added here below " + allowed +
                     " only; elsewhere by lookhaven mount add on the machine itself");
}

struct stat StatusOf(const base::FileDescriptor& folder, const std::string& path) {
    struct stat status {};
    if (::fstat(folder.Get(), &status) != 0) {
        Refuse(path, std::generic_category().message(errno));
    }
    return status;
}

bool IsSame(const struct stat& one, const struct stat& other) {
    return one.st_dev == other.st_dev && one.st_ino == other.st_ino;
}

// Whether root or the server's own user has it, and nobody else can write to it.
bool IsOwn(const struct stat& status) {
    const bool is_own_group = status.st_gid == 0 || status.st_gid == ::getegid();
    const mode_t others_write = S_IWOTH | (is_own_group ? 0U : S_IWGRP);
    return (status.st_uid == 0 || status.st_uid == ::geteuid()) && (status.st_mode & others_write) == 0;
}

// Nobody else can put something in the place of what is in it.
bool IsSafeParent(struct stat status) {
    if ((status.st_mode & S_ISVTX) != 0) {
        status.st_mode &= ~mode_t{S_IWGRP | S_IWOTH};
    }
    return IsOwn(status);
}

// Goes down from the root without following a link.
void RequireSafePath(const base::Installation& installation, const std::string& path) {
    struct stat home {};
    if (::stat(installation.Home().c_str(), &home) != 0) {
        Refuse(path, "the state folder cannot be looked at");
    }
    base::FileDescriptor folder(::open("/", kStepFlags));
    for (const fs::path& name : fs::path(path).relative_path()) {
        if (!IsSafeParent(StatusOf(folder, path))) {
            Refuse(path, "others could replace it, who can write to a folder above it");
        }
        base::FileDescriptor next(::openat(folder.Get(), name.c_str(), kStepFlags));
        if (!next) {
            Refuse(path, errno == ENOENT ? "it does not exist; create it, or mount its disk, first"
                                         : "it is not a folder, or there is a symbolic link in its path");
        }
        folder = std::move(next);
        if (IsSame(StatusOf(folder, path), home)) {
            Refuse(path, "it lies in the state folder");
        }
    }
    if (!IsOwn(StatusOf(folder, path))) {
        Refuse(path, "others than root and the server's account own it or can write to it");
    }
    if (IsBelow(fs::canonical(installation.Home()).string(), path)) {
        Refuse(path, "the state folder lies in it");
    }
}

bool WasOurMount(store::Store& store, const std::string& path) {
    const auto marker = maintenance::MountFolder::ReadMarker(path);
    return marker && marker->installation == store::Settings(store).Installation() &&
           !store::Mounts(store).Find(marker->mount_id);
}

void RequireEmpty(store::Store& store, const std::string& path) {
    for (const fs::directory_entry& entry : fs::directory_iterator(path)) {
        if (entry.path().filename() != "lost+found" && !WasOurMount(store, path)) {
            Refuse(path, "it is not empty; make a folder of its own for recordings in it");
        }
    }
}

}  // namespace

void RequireMountPlace(store::Store& store, const base::Installation& installation, const std::string& path) {
    RequireAllowed(store, path);
    RequireSafePath(installation, path);
    if (::access(path.c_str(), R_OK | W_OK | X_OK) != 0) {
        Refuse(path, "the server has no write access to it");
    }
    try {
        RequireEmpty(store, path);
    } catch (const std::system_error& error) {
        Refuse(path, error.code().message());
    }
}

}  // namespace lookhaven::admin
