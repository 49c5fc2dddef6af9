// SPDX-License-Identifier: Apache-2.0
//
// Splits an endless multipart response into its parts.
//
// Why so        Cameras differ in how they write the boundary and in whether they give a part's length; and no part may
//               use unbounded memory, whatever the camera claims or sends.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace lookhaven::media {

// The boundary in a Content-Type such as "multipart/x-mixed-replace; boundary=frame"; empty for one that is not
// multipart.
std::string BoundaryOf(std::string_view content_type);

class MultipartReader {
  public:
    // Fills the beginning of the buffer and returns the number of bytes, at least one; throws at the end of the input.
    using Input = std::function<std::size_t(std::span<std::uint8_t>)>;

    MultipartReader(std::string boundary, std::size_t max_part_bytes, Input input);

    // The next part's body, exactly as it was sent, valid until the next call. Parts above the limit are skipped.
    // Throws SourceError when the input is no multipart response or has ended, and whatever the input throws.
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
