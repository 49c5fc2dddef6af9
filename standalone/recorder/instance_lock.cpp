// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/instance_lock.h"

#include <cerrno>
#include <filesystem>
#include <stdexcept>
#include <string>

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/base/io.h"

namespace lookhaven::recorder {

InstanceLock::InstanceLock(const base::Installation& installation) {
    const std::filesystem::path path = installation.RunFolder() / "recorder.lock";
    file_ = base::OpenFile(path, O_RDWR | O_CREAT);
    if (::flock(file_.Get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK) {
            base::ThrowErrno("cannot lock " + path.string());
        }
        throw std::runtime_error("another recorder runs for " + installation.Home().string() + " (process " +
                                 base::ReadFile(path) + ")");
    }
    const std::string pid = std::to_string(::getpid());
    if (::ftruncate(file_.Get(), 0) != 0 || !base::WriteAllAt(file_.Get(), pid.data(), pid.size(), 0)) {
        base::ThrowErrno("cannot write " + path.string());
    }
}

}  // namespace lookhaven::recorder
