// SPDX-License-Identifier: Apache-2.0
//
// Recordings for tests: Motion JPEG as far as a player looks, with a text instead of each picture.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>

#include "standalone/archive/frame_index.h"
#include "standalone/store/events.h"
#include "standalone/store/store.h"

namespace lookhaven::test {

// Writes a recording frame by frame; frame 3 is "picture 3". Until Finish it is a growing one.
class WrittenRecording {
  public:
    WrittenRecording(const std::filesystem::path& path, std::int64_t start_wall_ms, int period_ms);
    void Append(int frames);
    void Finish() { index_.Finish(); }

  private:
    std::filesystem::path path_;
    archive::FrameIndexWriter index_;
    int period_ms_;
    int frames_ = 0;
};

// A store with one mount, below the folder, and cameras 1 … 3.
class Footage {
  public:
    Footage(const std::string& store_url, const std::filesystem::path& folder);

    // A finished event of 10 pictures a second with its row and its files; returns its id.
    int Record(int camera, std::int64_t start_s, int seconds);
    // An alert or POS event with footage of the recorded event; returns its id.
    int Mark(int kind, int camera, std::int64_t start_s, int seconds, const std::string& text, int event);
    // Makes the mount one that hosts 1 … hosts of the store share.
    void ShareMount(int hosts);
    std::filesystem::path FileOf(int event);
    const std::filesystem::path& Mount() const { return mount_; }
    int MountId() const { return mount_id_; }
    store::Store& Records() { return records_; }

  private:
    store::Store records_;
    std::filesystem::path mount_;
    int mount_id_ = 0;
};

}  // namespace lookhaven::test
