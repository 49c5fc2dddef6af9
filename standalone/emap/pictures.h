// SPDX-License-Identifier: Apache-2.0
//
// The picture files of e-maps, in the folder "emaps" of the state folder.
//
// Why so        A picture comes from a stranger's disk: its type is learned from what it holds, its file is named by
//               us, and a name out of the store opens no file elsewhere. The file is complete on disk before a map
//               names it, so that a map never loses its picture to a crash.
#pragma once

#include <cstddef>
#include <filesystem>
#include <string>
#include <string_view>

#include "standalone/store/emaps.h"

namespace lookhaven::emap {

constexpr std::size_t kMaxPictureBytes = 16U << 20U;

// "png", "jpg", "webp" or "svg"; empty for anything else. An SVG that declares entities is nothing of these.
std::string_view PictureType(std::string_view bytes);

// Whether a file in that folder may have the name: "<digits>-<16 hex digits>.<type>".
bool IsPictureName(std::string_view name);

class Pictures {
  public:
    // The store must outlive this object.
    Pictures(store::Store& store, const std::filesystem::path& home) : store_(store), folder_(home / "emaps") {}

    // Gives the map another picture; then removes the last one, and files that no map names. Throws
    // store::InvalidRecord for what is no picture or larger than kMaxPictureBytes, store::NotFound for an unknown map,
    // std::system_error when it cannot be written. After an error the map has its old picture.
    void Put(int emap_id, std::string_view bytes);

    // Removes files that no map names, a minute after they were written: a map's removal leaves one behind.
    void Sweep();

    // The file's bytes. Throws std::system_error when there is none, also for a name that is none of ours.
    std::string Read(const std::string& name) const;

  private:
    store::Store& store_;
    std::filesystem::path folder_;
};

}  // namespace lookhaven::emap
