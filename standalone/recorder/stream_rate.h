// SPDX-License-Identifier: Apache-2.0
//
// Pictures and bytes a second of a stream, from its running totals.
#pragma once

#include <cstdint>

#include "standalone/recorder/stream_worker.h"

namespace lookhaven::recorder {

class StreamRate {
  public:
    // Call it about every second. A stream that was restarted counts from 0 again.
    void Note(const StreamCounts& counts, std::int64_t now_us) {
        if (at_us_ != 0 && now_us > at_us_ && counts.pictures >= pictures_ && counts.bytes >= bytes_) {
            const double seconds = static_cast<double>(now_us - at_us_) / 1e6;
            const double weight = is_measured_ ? 0.25 : 1;  // the last seconds, mostly
            pictures_per_second_ +=
                weight * (static_cast<double>(counts.pictures - pictures_) / seconds - pictures_per_second_);
            bytes_per_second_ += weight * (static_cast<double>(counts.bytes - bytes_) / seconds - bytes_per_second_);
            is_measured_ = pictures_per_second_ > 0;
        }
        at_us_ = now_us;
        pictures_ = counts.pictures;
        bytes_ = counts.bytes;
    }

    double PicturesPerSecond() const { return pictures_per_second_; }
    double BytesPerSecond() const { return bytes_per_second_; }

  private:
    std::int64_t at_us_ = 0;
    std::uint64_t pictures_ = 0;
    std::uint64_t bytes_ = 0;
    bool is_measured_ = false;
    double pictures_per_second_ = 0;
    double bytes_per_second_ = 0;
};

}  // namespace lookhaven::recorder
