// SPDX-License-Identifier: Apache-2.0
//
// Takes an endless multipart answer apart into its bodies.
//
// Why so        Cameras differ in how they write the boundary and in whether they say a part's length; and a part must
//               not take memory without bound, whatever the camera claims or sends.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace lookhaven::media {

// The boundary named by a Content-Type such as "multipart/x-mixed-replace; boundary=frame", empty when it is none.
std::string BoundaryOf(std::string_view content_type);

class MultipartReader {
  public:
    // Fills the beginning of the buffer with at least one byte and returns how many; throws at the end.
    using Input = std::function<std::size_t(std::span<std::uint8_t>)>;

    MultipartReader(std::string boundary, std::size_t max_part_bytes, Input input);

    // The next part's body, byte by byte as it was sent, valid until the next call. Larger parts are read past. Throws
    // SourceError when what comes is no multipart answer or it is over, and whatever the input throws.
    std::span<const std::uint8_t> Next();

  private:
    std::uint8_t Peek();
    std::uint8_t ReadByte();
    std::string ReadLine();
    void SkipToBoundary();
    std::size_t ReadHead();
    bool ReadSized(std::size_t size);
    bool ReadToBoundary();

    std::string delimiter_;  // with its leading dashes
    std::size_t max_part_bytes_;
    Input input_;
    std::vector<std::uint8_t> buffer_;
    std::size_t begin_ = 0;
    std::size_t end_ = 0;
    std::vector<std::uint8_t> part_;
    bool at_boundary_ = false;
};

}  // namespace lookhaven::media
