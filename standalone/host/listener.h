// SPDX-License-Identifier: Apache-2.0
//
// The socket that the host listens on: its own, or one that the service manager opened for it.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <utility>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::host {

// Makes descriptors 0, 1 and 2 exist, so that no other file ever gets these numbers.
void OpenStandardDescriptors();

// A socket file of its own is open to user and group, replaces one that nobody listens on, and is removed when the
// socket is closed, unless a successor has replaced it.
class Listener {
  public:
    // Takes descriptor 3 when LISTEN_PID and LISTEN_FDS say that it was handed over, else listens on the path. Throws
    // std::system_error, or std::runtime_error when somebody listens on the path already.
    explicit Listener(const std::filesystem::path& path);
    ~Listener() { Close(); }
    Listener(const Listener&) = delete;
    Listener& operator=(const Listener&) = delete;

    // -1 once closed.
    int Socket() const { return socket_.Get(); }
    void Close();
    std::string Name() const { return path_.empty() ? "a socket handed over" : path_.string(); }

  private:
    base::FileDescriptor socket_;
    std::filesystem::path path_;                   // of its own socket file
    std::optional<std::pair<dev_t, ino_t>> file_;  // the file that was made there; a successor may have replaced it
};

}  // namespace lookhaven::host
