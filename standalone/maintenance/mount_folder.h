// SPDX-License-Identifier: Apache-2.0
//
// The folder of a storage mount, and the only code that removes anything from it.
//
// Why so        A disk that is not mounted leaves an empty folder, which looks like a mount whose recordings are gone;
//               rows must not be removed for that. So a mount carries a marker, the file .lookhaven-mount. It says
//               whose mount it is, too: two installations on one folder would remove each other's footage.
// Invariants    (1) Only the files of archive/layout.h are ever removed, folders that became empty, and the file of
//               TakesAnotherFile.
//               (2) Everything is opened relative to the mount's own descriptor and without following symbolic links:
//               no call leaves the mount.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include "standalone/archive/layout.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/store/mounts.h"

namespace lookhaven::maintenance {

struct MountSpace {
    std::int64_t total_bytes = 0;  // 0 where the file system does not say
    std::int64_t free_bytes = 0;   // available to this process, not to root; plenty where the file system does not say
    std::int64_t total_files = 0;  // that the file system has room for; 0 where it has no such limit
    std::int64_t free_files = 0;

    // What recording leaves free: a fiftieth of the disk, 2 MiB … 512 MiB.
    std::int64_t ReserveBytes() const;
    // Whether retention makes room: less than twice that is free.
    bool IsShort() const { return free_bytes < 2 * ReserveBytes(); }
    // The same of files, 10,000 at most.
    std::int64_t ReserveFiles() const;
};

// Whether the error says that there is no such file. Any other says nothing of what lies there.
bool MeansAbsent(int error);

constexpr const char* kMarkerName = ".lookhaven-mount";

// What a marker says.
struct MountMarker {
    int mount_id = 0;
    std::string installation;  // store::Settings::Installation; empty in markers of early versions

    bool operator==(const MountMarker&) const = default;
};

class MountFolder {
  public:
    // Makes the folder that of the mount; another marker is replaced. Only when an owner says so: a folder that merely
    // looks empty may be a mount point without its disk. Throws std::system_error.
    static void WriteMarker(const std::filesystem::path& folder, const MountMarker& marker);
    // Nothing when there is none, or what is there is no marker. Throws std::system_error when that cannot be told.
    static std::optional<MountMarker> ReadMarker(const std::filesystem::path& folder);

    // Nothing when the folder is missing or lacks that mount's marker: the disk is not mounted. Throws
    // std::system_error when that cannot be told.
    static std::optional<MountFolder> Open(const std::filesystem::path& folder, const MountMarker& marker);

    const std::filesystem::path& Path() const { return path_; }
    // Throws std::system_error.
    MountSpace Space() const;
    // Whether the file system has room for one more file, as making one shows. Throws std::system_error when neither
    // can be told.
    bool TakesAnotherFile() const;

    // Whether anything of the camera was recorded on that UTC day.
    bool HasDay(int camera, std::int64_t second) const { return static_cast<bool>(OpenDay(camera, second)); }
    // Whether it exists, as a regular file. Throws std::system_error when that cannot be told.
    bool Has(const archive::FileName& name) const;
    // Removes the file, and a recording's index with it. False when neither existed. Throws std::system_error when the
    // file cannot be removed; it is still there then. An index that cannot be removed stays behind, and verify finds
    // it.
    bool Remove(const archive::FileName& name) const;
    // Renames a recording and its index to another event's id. False when that name is taken. Throws std::system_error.
    bool Renumber(const archive::FileName& name, int event) const;
    // Removes the day's folder, with its recording log, when nothing else is left in it; and the camera's folder when
    // it is empty then.
    void RemoveDayIfEmpty(int camera, std::int64_t day_s) const;

    struct File {
        archive::FileName name;
        std::int64_t changed_s = 0;  // modification time
    };
    // All files that archive/layout.h knows, of that second's UTC day and later, in no order. Throws std::system_error.
    std::vector<File> Files(std::int64_t from_s = 0) const;
    // The highest number of a camera's folder; 0 when there is none. Throws std::system_error.
    int LastCamera() const;

  private:
    MountFolder(std::filesystem::path path, base::FileDescriptor folder);

    base::FileDescriptor OpenDay(int camera, std::int64_t second) const;

    std::filesystem::path path_;
    base::FileDescriptor folder_;
};

// The marker that the mount's folder must have.
MountMarker MarkerFor(store::Store& store, int mount_id);
// MountFolder::Open with that marker. Throws store::StoreError, too.
std::optional<MountFolder> OpenMount(store::Store& store, const store::Mount& mount);

}  // namespace lookhaven::maintenance
