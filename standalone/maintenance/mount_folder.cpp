// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/mount_folder.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include "standalone/archive/file.h"
#include "standalone/base/file.h"

namespace lookhaven::maintenance {

namespace {

constexpr const char* kMarkerName = ".lookhaven-mount";
constexpr std::size_t kMaxMarkerBytes = 64;
constexpr const char* kLogName = "seconds";
constexpr int kFolderFlags = O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW;

std::string MarkerText(int mount_id) {
    return "lookhaven mount " + std::to_string(mount_id) + "\n";
}

// Empty when there is no such folder. Throws std::system_error when it cannot be told.
base::FileDescriptor OpenFolderAt(int parent, const char* name) {
    base::FileDescriptor folder(::openat(parent, name, kFolderFlags));
    if (!folder && !MeansAbsent(errno)) {
        base::ThrowErrno(std::string("cannot open the folder of recordings ") + name);
    }
    return folder;
}

bool IsCameraFolder(const std::string& name) {
    return !name.empty() && name.find_first_not_of("0123456789") == name.npos;
}

// The names in the folder, without "." and "..".
std::vector<std::string> NamesIn(int folder) {
    std::vector<std::string> names;
    base::FileDescriptor own = OpenFolderAt(folder, ".");
    const std::unique_ptr<DIR, int (*)(DIR*)> listing(own ? ::fdopendir(own.Get()) : nullptr, &::closedir);
    if (!listing) {
        base::ThrowErrno("cannot list a folder of recordings");
    }
    own.Release();
    errno = 0;
    while (const dirent* entry = ::readdir(listing.get())) {
        if (const std::string_view name = entry->d_name; name != "." && name != "..") {
            names.emplace_back(name);
        }
    }
    if (errno != 0) {
        base::ThrowErrno("cannot list a folder of recordings");
    }
    return names;
}

std::string FileNameOf(const archive::FileName& name) {
    return std::filesystem::path(archive::PathOf(name)).filename();
}

std::vector<archive::FileName> WithIndex(archive::FileName name) {
    std::vector<archive::FileName> names{name};
    if (name.kind == archive::FileKind::kRecording) {
        name.kind = archive::FileKind::kIndex;
        names.push_back(name);
    }
    return names;
}

}  // namespace

bool MeansAbsent(int error) {
    return error == ENOENT || error == ENOTDIR;
}

std::int64_t MountSpace::ReserveBytes() const {
    constexpr std::int64_t kMiB = 1 << 20;
    return std::clamp(total_bytes / 50, 2 * kMiB, 512 * kMiB);
}

void MountFolder::WriteMarker(const std::filesystem::path& folder, int mount_id) {
    archive::WriteFileAtomically(folder / kMarkerName, MarkerText(mount_id), 0644);
}

std::optional<MountFolder> MountFolder::Open(const std::filesystem::path& folder, int mount_id) {
    try {
        if (archive::ReadFile(folder / kMarkerName, kMaxMarkerBytes) != MarkerText(mount_id)) {
            return std::nullopt;
        }
        return MountFolder(folder, base::OpenFile(folder, O_RDONLY | O_DIRECTORY));
    } catch (const std::system_error& error) {
        // A link or a folder in the marker's place is not ours.
        if (MeansAbsent(error.code().value()) || error.code().value() == ELOOP) {
            return std::nullopt;
        }
        throw;
    }
}

bool MountFolder::HasNoMarker(const std::filesystem::path& folder) {
    struct stat status {};
    return ::stat(folder.c_str(), &status) == 0 && S_ISDIR(status.st_mode) &&
           ::lstat((folder / kMarkerName).c_str(), &status) != 0 && errno == ENOENT;
}

MountFolder::MountFolder(std::filesystem::path path, base::FileDescriptor folder)
    : path_(std::move(path)),
      folder_(std::move(folder)) {}

MountSpace MountFolder::Space() const {
    struct statvfs status {};
    if (::fstatvfs(folder_.Get(), &status) != 0) {
        base::ThrowErrno("cannot find out the free space on " + path_.string());
    }
    const auto block = static_cast<std::int64_t>(status.f_frsize);
    return {static_cast<std::int64_t>(status.f_blocks) * block, static_cast<std::int64_t>(status.f_bavail) * block};
}

base::FileDescriptor MountFolder::OpenDay(int camera, std::int64_t second) const {
    const base::FileDescriptor folder = OpenFolderAt(folder_.Get(), std::to_string(camera).c_str());
    return folder ? OpenFolderAt(folder.Get(), archive::DayOf(second).c_str()) : base::FileDescriptor();
}

bool MountFolder::Has(const archive::FileName& name) const {
    const base::FileDescriptor day = OpenDay(name.camera, name.start_s);
    struct stat status {};
    if (!day) {
        return false;
    }
    if (::fstatat(day.Get(), FileNameOf(name).c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) {
        if (!MeansAbsent(errno)) {
            base::ThrowErrno("cannot look for " + (path_ / archive::PathOf(name)).string());
        }
        return false;
    }
    return S_ISREG(status.st_mode);
}

bool MountFolder::Remove(const archive::FileName& name) const {
    const base::FileDescriptor day = OpenDay(name.camera, name.start_s);
    bool removed = false;
    for (const archive::FileName& each : day ? WithIndex(name) : std::vector<archive::FileName>()) {
        if (::unlinkat(day.Get(), FileNameOf(each).c_str(), 0) == 0) {
            removed = true;
        } else if (errno != ENOENT && each.kind == name.kind) {
            base::ThrowErrno("cannot remove " + (path_ / archive::PathOf(each)).string());
        }
    }
    return removed;
}

bool MountFolder::Renumber(const archive::FileName& name, int event) const {
    const base::FileDescriptor day = OpenDay(name.camera, name.start_s);
    for (const archive::FileName& each : WithIndex(name)) {
        archive::FileName renamed = each;
        renamed.event = event;
        if (::renameat2(day.Get(), FileNameOf(each).c_str(), day.Get(), FileNameOf(renamed).c_str(),
                        RENAME_NOREPLACE) != 0) {
            if (errno == EEXIST) {
                return false;
            }
            if (errno == ENOENT && each.kind == archive::FileKind::kIndex) {
                continue;  // a missing index is rebuilt
            }
            base::ThrowErrno("cannot rename " + (path_ / archive::PathOf(each)).string());
        }
    }
    return true;
}

void MountFolder::RemoveDayIfEmpty(int camera, std::int64_t day_s) const {
    const std::string day_name = archive::DayOf(day_s);
    const base::FileDescriptor folder = OpenFolderAt(folder_.Get(), std::to_string(camera).c_str());
    const base::FileDescriptor day = folder ? OpenFolderAt(folder.Get(), day_name.c_str()) : base::FileDescriptor();
    if (!day) {
        return;
    }
    const std::vector<std::string> names = NamesIn(day.Get());
    if (names.empty() || names == std::vector<std::string>{kLogName}) {
        ::unlinkat(day.Get(), kLogName, 0);
        if (::unlinkat(folder.Get(), day_name.c_str(), AT_REMOVEDIR) == 0) {
            ::unlinkat(folder_.Get(), std::to_string(camera).c_str(), AT_REMOVEDIR);
        }
    }
}

std::vector<MountFolder::File> MountFolder::Files(std::int64_t from_s) const {
    std::vector<File> files;
    const std::string first_day = archive::DayOf(from_s);
    for (const std::string& camera : NamesIn(folder_.Get())) {
        const base::FileDescriptor folder =
            IsCameraFolder(camera) ? OpenFolderAt(folder_.Get(), camera.c_str()) : base::FileDescriptor();
        for (const std::string& day : folder ? NamesIn(folder.Get()) : std::vector<std::string>()) {
            const base::FileDescriptor day_folder =
                day >= first_day ? OpenFolderAt(folder.Get(), day.c_str()) : base::FileDescriptor();
            for (const std::string& file : day_folder ? NamesIn(day_folder.Get()) : std::vector<std::string>()) {
                struct stat status {};
                const std::optional<archive::FileName> name = archive::ParsePath(camera + "/" + day + "/" + file);
                if (name && ::fstatat(day_folder.Get(), file.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
                    S_ISREG(status.st_mode)) {
                    files.push_back({*name, status.st_mtim.tv_sec});
                }
            }
        }
    }
    return files;
}

}  // namespace lookhaven::maintenance
