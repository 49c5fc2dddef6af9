// SPDX-License-Identifier: Apache-2.0
//
// Starts and ends lookhaven-camera, the process that reads one camera.
#pragma once

#include <string>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::camera {

// The descriptor of its end of the socket, in the camera's process.
constexpr int kSocketOfProcess = 3;

class CameraProcess {
  public:
    // Starts the program, which lies beside the calling one, with nothing but the socket: no other descriptor, no
    // environment. It dies with the calling thread. Throws media::SourceError.
    CameraProcess();
    CameraProcess(const CameraProcess&) = delete;
    CameraProcess& operator=(const CameraProcess&) = delete;
    ~CameraProcess() { End(); }

    // A stream socket; the process has the other end.
    int Socket() const { return socket_.Get(); }

    // Kills it unless it has ended; says how it ended. No process is left of it. The destructor does the same.
    std::string End();

  private:
    base::FileDescriptor socket_;
    pid_t pid_ = -1;
};

}  // namespace lookhaven::camera
