// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/mount_lock.h"

#include <cerrno>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include "standalone/archive/mount_file.h"
#include "standalone/maintenance/mount_folder.h"

namespace lookhaven::maintenance {

namespace {

bool IsSameFile(int one, int other) {
    struct stat a {};
    struct stat b {};
    return ::fstat(one, &a) == 0 && ::fstat(other, &b) == 0 && a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

}  // namespace

bool MountLock::Hold(const std::filesystem::path& folder) {
    base::FileDescriptor marker = archive::OpenFile(folder / kMarkerName, O_RDONLY);
    // The marker is replaced when an owner renews it.
    if (marker_ && IsSameFile(marker_.Get(), marker.Get())) {
        return true;
    }
    // Any process that can read the marker can lock it, so only its owner may. Fails, harmlessly, for a file of another
    // owner and on a file system without modes.
    ::fchmod(marker.Get(), 0600);
    if (::flock(marker.Get(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK) {
        return false;
    }
    marker_ = std::move(marker);
    return true;
}

bool MountLock::IsHeld(const std::filesystem::path& folder) {
    const base::FileDescriptor marker = archive::OpenFile(folder / kMarkerName, O_RDONLY);
    return ::flock(marker.Get(), LOCK_SH | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

}  // namespace lookhaven::maintenance
