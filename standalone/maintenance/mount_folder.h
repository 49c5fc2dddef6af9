// SPDX-License-Identifier: Apache-2.0
//
// The folder of a storage mount, and the only hands that remove anything from it.
//
// Why so        A disk that is not mounted leaves an empty folder that looks like a mount whose recordings are gone, and
//               rows must not be dropped for that. So a mount carries a mark, the file .lookhaven-mount.
// Invariants    (1) Nothing but the files of archive/layout.h is ever removed, and folders that became empty.
//               (2) Everything is reached from the mount's own descriptor, by components that are no symbolic links: no
//               call leaves the mount.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <vector>

#include "standalone/archive/layout.h"
#include "standalone/base/file_descriptor.h"

namespace lookhaven::maintenance {

struct MountSpace {
    std::int64_t total_bytes = 0;
    std::int64_t free_bytes = 0;  // for us

    // Recording leaves so much free; a fiftieth, 2 MiB … 512 MiB.
    std::int64_t ReserveBytes() const;
};

class MountFolder {
  public:
    // Puts the mark of mount id into the folder; another mount's mark is replaced. Throws std::system_error.
    static void Mark(const std::filesystem::path& folder, int mount_id);

    // The folder, or nothing when it is missing or does not carry that mount's mark: the disk is not there.
    static std::optional<MountFolder> Open(const std::filesystem::path& folder, int mount_id);
    // It is there and carries no mark at all.
    static bool IsUnmarked(const std::filesystem::path& folder);

    const std::filesystem::path& Path() const { return path_; }
    // Throws std::system_error.
    MountSpace Space() const;

    // Something of the camera was recorded on that UTC day.
    bool HasDay(int camera, std::int64_t second) const { return static_cast<bool>(OpenDay(camera, second)); }
    // A regular file lies there.
    bool Has(const archive::FileName& name) const;
    // Removes a recording with its index, or the file itself for another kind; false when nothing of it was there.
    // Throws std::system_error.
    bool Remove(const archive::FileName& name) const;
    // Gives a recording and its index another event's number. False when that name is taken. Throws std::system_error.
    bool Renumber(const archive::FileName& name, int event) const;
    // Removes the day's folder when no file but the recording log is left in it, and the camera's when that was its last.
    void RemoveDayIfEmpty(int camera, std::int64_t day_s) const;

    struct File {
        archive::FileName name;
        std::int64_t changed_s = 0;
    };
    // All files of ours from that second's day on, in no order; what is unknown is left out. Throws std::system_error.
    std::vector<File> Files(std::int64_t from_s = 0) const;

  private:
    MountFolder(std::filesystem::path path, base::FileDescriptor folder);

    base::FileDescriptor OpenDay(int camera, std::int64_t second) const;

    std::filesystem::path path_;
    base::FileDescriptor folder_;
};

}  // namespace lookhaven::maintenance
