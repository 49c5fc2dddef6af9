// SPDX-License-Identifier: Apache-2.0
//
// Makes sure that only one recorder works on a mount.
//
// Why so        A copy of a state folder has the same id as the original, so the marker cannot tell their recorders
//               apart. Each would remove what the other has recorded. The lock is on the marker and ends with the
//               process.
#pragma once

#include <filesystem>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::maintenance {

class MountLock {
  public:
    // Takes or keeps the lock of a mount that is there, until Release or destruction. False while another process has
    // it; true where the file system knows no locks. Throws std::system_error.
    bool Hold(const std::filesystem::path& folder);
    void Release() { marker_.Reset(); }

    // Whether a process has the lock. Throws std::system_error.
    static bool IsHeld(const std::filesystem::path& folder);

  private:
    base::FileDescriptor marker_;
};

}  // namespace lookhaven::maintenance
