// SPDX-License-Identifier: Apache-2.0
//
// A recorder process with a state folder of its own, and viewers of what it records.
#pragma once

#include <chrono>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "standalone/base/installation.h"
#include "standalone/control/demand.h"
#include "standalone/media/packet.h"
#include "standalone/ring/reader.h"
#include "standalone/store/cameras.h"
#include "test/support/folder.h"
#include "test/support/wait.h"

namespace lookhaven::test {

// A source that costs little.
constexpr const char* kSmallPattern = "test:mjpeg?size=160x120&fps=25";

// A program that dies with the test.
class Child {
  public:
    // Its standard output and error go to the file.
    Child(const std::vector<std::string>& command, const std::filesystem::path& output);
    Child(Child&& other) noexcept : pid_(std::exchange(other.pid_, -1)) {}
    ~Child();

    void Signal(int signal) const;
    // Its wait status once it has ended, or nothing when the time was over first.
    std::optional<int> Wait(std::chrono::milliseconds limit = std::chrono::seconds(10));
    // How many descriptors ("fd") or threads ("task") it has.
    std::size_t Count(const char* kind) const;
    std::vector<pid_t> Children() const;

  private:
    pid_t pid_;
};

// A copy of one entry of a ring.
struct Seen {
    std::string data;
    bool key_frame = false;
    std::int64_t timestamp_us = 0;
};

// Watches one stream, and requests it from the recorder for as long as frames are read.
class Viewer {
  public:
    Viewer(const base::Installation& installation, int camera, base::Medium medium = base::Medium::kVideo);
    Viewer(const Viewer&) = delete;
    Viewer& operator=(const Viewer&) = delete;
    ~Viewer() { Leave(); }

    // The next entry of the run; attaches again when the ring was retired. Fails the test when none comes in time.
    Seen Next(std::chrono::milliseconds limit = std::chrono::seconds(20));
    std::vector<Seen> Take(std::size_t count);
    // The ring has a current frame.
    bool HasPicture();
    // Attached to a ring that is not retired.
    bool IsCurrent() const { return ring_ != nullptr && !ring::IsRetired(ring_); }
    const void* Ring() const { return ring_; }

  private:
    bool Attach();
    void Leave();

    const base::Installation& installation_;
    ring::StreamId id_;
    control::Demand demand_;
    void* ring_ = nullptr;
    ring::Position position_;
    int last_sequence_ = ring::kNoSequence;
};

class RecorderTest : public testing::Test {
  protected:
    RecorderTest();
    ~RecorderTest() override;

    void MakeStore() const;
    // Makes the store where there is none yet.
    int AddCamera(const std::string& source, const std::optional<store::Credentials>& credentials = {}) const;
    void ChangeCamera(int id, const std::function<void(store::Camera&)>& change) const;
    Child StartRecorder(const std::string& no_data_limit_s = "1") const;
    std::string Log() const;
    std::size_t LogLines(const std::string& text) const;
    std::size_t Segments() const;

    TemporaryFolder home_;
    std::optional<base::Installation> installation_;
};

// How many pictures or audio blocks a decoder makes of these entries; stops at the first that it refuses.
std::size_t Decoded(const char* codec, std::span<const unsigned char> extra_data, std::span<const Seen> entries);

// Decoding succeeds from every key frame on, and there are at least so many of them.
void ExpectDecodesFromEveryKeyFrame(const std::vector<Seen>& entries, std::size_t min_key_frames,
                                    const char* codec = "h264");

}  // namespace lookhaven::test
