// SPDX-License-Identifier: Apache-2.0
//
// The picture files of e-maps, in the folder "emaps" of the state folder; where several hosts may share the store, it
// has the pictures too, for the hosts that have not the files.
//
// Why so        A picture is untrusted input: its type is learned from what it holds, its file is named by
//               us, and a name out of the store opens no file elsewhere. The file is complete on disk before a map
//               names it, so that a map never loses its picture to a crash.
#pragma once

#include <cstddef>
#include <filesystem>
#include <set>
#include <string>
#include <string_view>

#include "standalone/store/emaps.h"

namespace lookhaven::emap {

constexpr std::size_t kMaxPictureBytes = 16U << 20U;

// "png", "jpg", "webp" or "svg"; empty for anything else. An SVG that declares entities is nothing of these.
std::string_view PictureType(std::string_view bytes);

// Whether a file in that folder may have the name: "<digits>-<16 hex digits>.<type>". The digits are the second in
// which it was written.
bool IsPictureName(std::string_view name);

class Pictures {
  public:
    // The store must outlive this object.
    Pictures(store::Store& store, const std::filesystem::path& home) : store_(store), folder_(home / "emaps") {}

    // Writes a picture that no map has yet, and returns its file's name for store::Emaps::SetImage. Waits for the disk:
    // call it before the store is locked. Throws store::InvalidRecord for what is no picture or larger than
    // kMaxPictureBytes, std::system_error when the file cannot be written.
    std::string Write(std::string_view bytes);
    // Removes what Write has just written unless a map has it by now.
    void Withdraw(const std::string& name);
    // Call before a map loses its picture: Sweep spares it for a minute, for processes that have just read the map's
    // row.
    void Touch(const std::string& name);

    // Removes files that no map names, a minute after they were written or touched, and what the store has of them ten
    // minutes after, since the clocks of hosts differ.
    void Sweep();

    // Puts those of this host's files that the store lacks into it, where several hosts may share it: pictures from
    // before this host was one of them. What fails is logged, and tried again when it is called next.
    void Share();

    // The file's bytes, or the store's, which are a file here from then on where a map has the picture and the disk has
    // room; what no map has any more is removed then, as Sweep does. Throws std::system_error when neither is there,
    // also for a name that is not one of ours.
    std::string Read(const std::string& name);

  private:
    std::string ReadFile(const std::string& name) const;
    void SaveFile(const std::string& name, std::string_view bytes) noexcept;
    void SweepFiles(const std::set<std::string>& used);
    std::set<std::string> Used();

    store::Store& store_;
    std::filesystem::path folder_;
};

}  // namespace lookhaven::emap
