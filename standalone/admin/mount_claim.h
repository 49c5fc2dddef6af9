// SPDX-License-Identifier: Apache-2.0
//
// Which folder a mount may have, and giving it to the mount.
#pragma once

#include <stdexcept>
#include <string>

#include "standalone/store/mounts.h"

namespace lookhaven::admin {

// The folder cannot be the mount's; nothing was changed. The text says why.
class UnusableFolder : public std::runtime_error {
  public:
    enum class Reason { kAbsent, kNoAccess, kTaken };

    UnusableFolder(Reason reason, const std::string& text) : std::runtime_error(text), reason_(reason) {}
    Reason Why() const { return reason_; }

  private:
    Reason reason_;
};

// The canonical path of a folder that this process can write, without links and dots. Throws UnusableFolder.
std::string RequireFolder(const std::string& path);

// Throws UnusableFolder for a folder that is another mount's, of this installation or of another one, which would lose
// its footage; not with take_over. mount_id: 0 for a new mount. Throws std::system_error where the folder's marker
// cannot be read, and store::StoreError.
void RequireFreeFolder(store::Store& store, const std::string& path, int mount_id, bool take_over);

// Throws UnusableFolder for a folder that is not marked as the shared mount, while other hosts have that: its disk may
// not be mounted here. Throws as RequireFreeFolder otherwise.
void RequireSharedFolder(store::Store& store, const store::Mount& mount, int own_host);

// Marks the folder as that of the mount. Throws std::system_error.
void MarkFolder(store::Store& store, const store::Mount& mount);

// Keeps later cameras and events from getting the ids of footage that is there. Reads the names of all files of
// the mount, which is marked. Throws std::system_error and store::StoreError.
void ReserveIds(store::Store& store, const store::Mount& mount);

}  // namespace lookhaven::admin
