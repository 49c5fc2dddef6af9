// SPDX-License-Identifier: Apache-2.0
//
// Makes sure that only one recorder runs for an installation.
#pragma once

#include "standalone/base/file_descriptor.h"
#include "standalone/base/installation.h"

namespace lookhaven::recorder {

// Held until destroyed, or until the process dies in whatever way.
class InstanceLock {
  public:
    // Throws std::runtime_error, naming the process, when another recorder holds the lock; std::system_error when the
    // run folder cannot be written.
    explicit InstanceLock(const base::Installation& installation);

  private:
    base::FileDescriptor file_;
};

}  // namespace lookhaven::recorder
