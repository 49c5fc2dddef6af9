// SPDX-License-Identifier: Apache-2.0
//
// What may become the picture of an e-map.
//
// Why so        A picture is untrusted input, and every viewer's browser decodes it. So a process of its own,
//               which can do nothing else, decodes it first, and what that process makes of the pixels is stored: no
//               other byte of the file is passed on.
#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <utility>

namespace lookhaven::emap {

// The largest file that is re-encoded; the result has kMaxPictureBytes at most (pictures.h).
constexpr std::size_t kMaxUploadBytes = 20U << 20U;

class MapPicture {
  public:
    // A PNG, JPEG or WebP file, re-encoded as PNG or JPEG; takes 30 seconds at most. Forks: call it without a store
    // open, in a process with one thread. confine: gives up, in the new process, what it got from this one beside
    // descriptors, which are closed. Throws store::InvalidRecord, which says what is wrong with the file,
    // std::system_error where no process can decode it.
    static MapPicture Reencoded(std::string_view file, const std::function<void()>& confine = {});

    // As Reencoded, but takes an SVG file as it is: of someone who could write the state folder as well.
    static MapPicture OfOperator(std::string_view file);

    const std::string& File() const { return file_; }

  private:
    explicit MapPicture(std::string file) : file_(std::move(file)) {}

    std::string file_;
};

}  // namespace lookhaven::emap
