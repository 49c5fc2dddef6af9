// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/mount_folder.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
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

#include "standalone/archive/mount_file.h"
#include "standalone/base/file.h"
#include "standalone/store/settings.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::size_t kMaxMarkerBytes = 128;
constexpr std::string_view kMarkerBegin = "lookhaven mount ";
constexpr std::string_view kMarkerOwner = " of ";
// A folder with a higher number as its name is not ours.
constexpr int kMaxCamera = 1'000'000;
constexpr const char* kLogName = "seconds";
constexpr const char* kProbeName = ".lookhaven-probe";
// Assumed for a file system that does not report its free space.
constexpr std::int64_t kAssumedFreeBytes = std::int64_t{1} << 50;
constexpr int kFolderFlags = O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NOFOLLOW;

std::string MarkerText(const MountMarker& marker) {
    return std::string(kMarkerBegin) + std::to_string(marker.mount_id) +
           (marker.installation.empty() ? "" : std::string(kMarkerOwner) + marker.installation) + "\n";
}

std::optional<MountMarker> ParseMarker(const std::string& text) {
    MountMarker marker;
    if (text.starts_with(kMarkerBegin)) {
        std::from_chars(text.data() + kMarkerBegin.size(), text.data() + text.size(), marker.mount_id);
    }
    if (const std::size_t at = text.find(kMarkerOwner); at != text.npos && text.ends_with('\n')) {
        marker.installation = text.substr(at + kMarkerOwner.size());
        marker.installation.pop_back();
    }
    return MarkerText(marker) == text ? std::optional(marker) : std::nullopt;
}

// Empty when there is no such folder. Throws std::system_error when it cannot be told.
base::FileDescriptor OpenFolderAt(int parent, const char* name) {
    base::FileDescriptor folder(::openat(parent, name, kFolderFlags));
    if (!folder && !MeansAbsent(errno)) {
        base::ThrowErrno(std::string("cannot open the folder of recordings ") + name);
    }
    return folder;
}

// The status of the file, which lies in the folder of that descriptor; nothing when there is no regular file. Throws
// std::system_error when that cannot be told.
std::optional<struct stat> RegularFileAt(int folder, const std::filesystem::path& file) {
    struct stat status {};
    if (::fstatat(folder, file.filename().c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) {
        if (!MeansAbsent(errno)) {
            base::ThrowErrno("cannot look for " + file.string());
        }
        return std::nullopt;
    }
    return S_ISREG(status.st_mode) ? std::optional(status) : std::nullopt;
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

// What a file system does not know it reports as 0 or -1.
MountSpace SpaceFrom(const struct statvfs& report) {
    const auto bytes = [&](std::uint64_t blocks) { return static_cast<std::int64_t>(blocks * report.f_frsize); };
    MountSpace space{bytes(report.f_blocks), bytes(report.f_bavail), static_cast<std::int64_t>(report.f_files),
                     static_cast<std::int64_t>(report.f_favail)};
    space.total_bytes = std::max<std::int64_t>(space.total_bytes, 0);
    if (space.total_bytes == 0 || space.free_bytes < 0) {
        space.free_bytes = kAssumedFreeBytes;
    }
    if (space.total_files <= 0 || space.free_files < 0) {
        space.total_files = space.free_files = 0;
    }
    return space;
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

std::int64_t MountSpace::ReserveFiles() const {
    return std::min<std::int64_t>(total_files / 50, 10'000);
}

void MountFolder::WriteMarker(const std::filesystem::path& folder, const MountMarker& marker) {
    archive::WriteFileAtomically(folder / kMarkerName, MarkerText(marker), 0600);
}

std::optional<MountFolder> MountFolder::Open(const std::filesystem::path& folder, const MountMarker& marker) {
    return ReadMarker(folder) == marker
               ? std::optional(MountFolder(folder, base::OpenFile(folder, O_RDONLY | O_DIRECTORY)))
               : std::nullopt;
}

std::optional<MountMarker> MountFolder::ReadMarker(const std::filesystem::path& folder) {
    try {
        return ParseMarker(archive::ReadFile(folder / kMarkerName, kMaxMarkerBytes));
    } catch (const std::system_error& error) {
        // A link or a folder in the marker's place is not ours.
        if (MeansAbsent(error.code().value()) || error.code().value() == ELOOP) {
            return std::nullopt;
        }
        throw;
    }
}

MountFolder::MountFolder(std::filesystem::path path, base::FileDescriptor folder)
    : path_(std::move(path)),
      folder_(std::move(folder)) {}

MountSpace MountFolder::Space() const {
    struct statvfs status {};
    if (::fstatvfs(folder_.Get(), &status) != 0) {
        base::ThrowErrno("cannot find out the free space on " + path_.string());
    }
    return SpaceFrom(status);
}

bool MountFolder::TakesAnotherFile() const {
    ::unlinkat(folder_.Get(), kProbeName, 0);  // of a process that was killed here
    const base::FileDescriptor probe(
        ::openat(folder_.Get(), kProbeName, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!probe && errno != ENOSPC && errno != EDQUOT) {
        base::ThrowErrno("cannot make a file on " + path_.string());
    }
    ::unlinkat(folder_.Get(), kProbeName, 0);
    return static_cast<bool>(probe);
}

base::FileDescriptor MountFolder::OpenDay(int camera, std::int64_t second) const {
    const base::FileDescriptor folder = OpenFolderAt(folder_.Get(), std::to_string(camera).c_str());
    return folder ? OpenFolderAt(folder.Get(), archive::DayOf(second).c_str()) : base::FileDescriptor();
}

bool MountFolder::Has(const archive::FileName& name) const {
    const base::FileDescriptor day = OpenDay(name.camera, name.start_s);
    return day && RegularFileAt(day.Get(), path_ / archive::PathOf(name));
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
                const std::optional<archive::FileName> name = archive::ParsePath(camera + "/" + day + "/" + file);
                const std::optional<struct stat> status =
                    name ? RegularFileAt(day_folder.Get(), path_ / camera / day / file) : std::nullopt;
                if (status) {
                    files.push_back({*name, status->st_mtim.tv_sec});
                }
            }
        }
    }
    return files;
}

int MountFolder::LastCamera() const {
    int last = 0;
    for (const std::string& name : NamesIn(folder_.Get())) {
        int camera = 0;
        std::from_chars(name.data(), name.data() + name.size(), camera);
        if (IsCameraFolder(name) && camera <= kMaxCamera) {
            last = std::max(last, camera);
        }
    }
    return last;
}

MountMarker MarkerFor(store::Store& store, int mount_id) {
    return {mount_id, store::Settings(store).Installation()};
}

std::optional<MountFolder> OpenMount(store::Store& store, const store::Mount& mount) {
    return MountFolder::Open(mount.path, MarkerFor(store, mount.id));
}

}  // namespace lookhaven::maintenance
