// SPDX-License-Identifier: Apache-2.0
//
// How many bytes a second each camera sends, over a whole minute: a key frame or a scene does not change it much.
//
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <map>

namespace lookhaven::recorder {

class CameraRates {
  public:
    // Call it about every second. received: bytes by camera, counts that grow, or begin anew with a stream.
    void Note(const std::map<int, std::uint64_t>& received, std::int64_t now_us);
    // By camera, as of the last minute in which it sent something.
    const std::map<int, std::int64_t>& BytesPerSecond() const { return bytes_per_second_; }

  private:
    struct Minute {
        std::int64_t began_us = 0;
        std::uint64_t bytes = 0;  // at its beginning
    };

    std::map<int, Minute> minutes_;
    std::map<int, std::int64_t> bytes_per_second_;
};

}  // namespace lookhaven::recorder
