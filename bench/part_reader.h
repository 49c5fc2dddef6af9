// SPDX-License-Identifier: Apache-2.0
//
// Takes a live stream apart and says how late each of its pictures arrived.
#pragma once

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "bench/frame_stamp.h"
#include "standalone/base/clock.h"

namespace bench {

// Takes a multipart body apart without keeping it: heads are collected line by line, bodies are counted.
class PartReader {
  public:
    // Feeds bytes as they arrive; appends one latency for each picture that ends in them.
    void Feed(const char* data, std::size_t size, std::vector<std::int64_t>& latencies) {
        while (size > 0) {
            const std::size_t used = body_left_ > 0 ? TakeBody(data, size, latencies) : TakeHead(data, size);
            data += used;
            size -= used;
        }
    }

  private:
    std::size_t TakeBody(const char* data, std::size_t size, std::vector<std::int64_t>& latencies) {
        const std::size_t used = std::min(size, body_left_);
        if (stamp_.size() < kStampedBytes) {
            stamp_.append(data, std::min(used, kStampedBytes - stamp_.size()));
        }
        body_left_ -= used;
        if (body_left_ == 0) {
            if (const std::int64_t made = ReadStamp(stamp_); made > 0) {
                latencies.push_back(lookhaven::base::MonotonicMicros() - made);
            }
            stamp_.clear();
        }
        return used;
    }

    std::size_t TakeHead(const char* data, std::size_t size) {
        const char* end = static_cast<const char*>(std::memchr(data, '\n', size));
        const std::size_t used = end == nullptr ? size : static_cast<std::size_t>(end - data) + 1;
        line_.append(data, used);
        if (end != nullptr) {
            constexpr std::string_view kLength = "content-length:";
            std::transform(line_.begin(), line_.end(), line_.begin(),
                           [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
            if (line_.starts_with(kLength)) {
                next_length_ = std::strtoull(line_.c_str() + kLength.size(), nullptr, 10);
            } else if (line_ == "\r\n") {
                body_left_ = std::exchange(next_length_, 0);
            }
            line_.clear();
        }
        return used;
    }

    std::string line_;
    std::string stamp_;
    std::size_t next_length_ = 0;
    std::size_t body_left_ = 0;
};

}  // namespace bench
