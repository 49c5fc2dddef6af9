// SPDX-License-Identifier: Apache-2.0
//
// A simulated HTTP camera that sends Motion JPEG to any number of clients and can misbehave.
#pragma once

#include <atomic>
#include <cstdint>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::test {

class MjpegCamera {
  public:
    enum class Mood {
        kFlow,       // 25 frames a second
        kStall,      // the connection stays open, nothing comes
        kHuge,       // frames above base::kMaxFrameBytes
        kPage,       // an HTML page instead of a stream
        kNoLengths,  // frames without their lengths, ended by the boundary
    };

    // Listens on a free port of 127.0.0.1. With a login ("user:password") it refuses other clients.
    explicit MjpegCamera(std::string login = "");
    ~MjpegCamera();

    std::string Url() const { return "http://127.0.0.1:" + std::to_string(port_) + "/video"; }
    // Applies from the next frame or request on.
    void SetMood(Mood mood) { mood_ = mood; }
    // Closes all connections and refuses new ones until Return, which listens on the same port again.
    void Vanish();
    void Return();
    int Connections() const { return connections_; }

    // A JPEG picture of 64 x 48 that contains the number; the same bytes every time.
    static std::string Frame(std::uint32_t number);
    // The number in the frame; -1 when it is not exactly a frame of this camera.
    static std::int64_t NumberOf(const std::string& frame);

  private:
    void Listen();
    void Accept(int listener);
    void Serve(base::FileDescriptor client);
    bool IsAdmitted(const std::string& request) const;

    const std::string login_;
    std::uint16_t port_ = 0;
    std::atomic<Mood> mood_ = Mood::kFlow;
    std::atomic<bool> gone_ = false;
    std::atomic<int> connections_ = 0;
    base::FileDescriptor listener_;
    std::thread accepting_;
    std::mutex mutex_;
    std::vector<std::thread> serving_;
};

}  // namespace lookhaven::test
