// SPDX-License-Identifier: Apache-2.0
//
// Makes a JPEG picture smaller.
//
// Why so        TurboJPEG decodes at eighths of a picture's size, which takes a fraction of the time of a whole
//               picture.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

namespace lookhaven::media {

// The picture at the fewest eighths of its size at which it is at least that wide. Of one that is cut off, what there
// is. Throws SourceError for what is no JPEG picture of a usable size.
std::vector<std::uint8_t> ShrinkJpeg(std::span<const std::uint8_t> jpeg, int width);

}  // namespace lookhaven::media
