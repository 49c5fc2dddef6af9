// SPDX-License-Identifier: Apache-2.0
//
// The streams that could run: enabled cameras and their profiles, as the store has them.
//
// Why so        A live stream must outlast the store: while that is away, the catalog keeps what it read last.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>

#include "standalone/recorder/stream_worker.h"
#include "standalone/store/store.h"

namespace lookhaven::recorder {

class Catalog {
  public:
    // Reads nothing yet.
    explicit Catalog(std::string store_url) : store_url_(std::move(store_url)) {}

    // Reads the cameras anew when the store says that something changed. A store that cannot be read is logged once and
    // opened again at the next call. Never throws.
    void Refresh() noexcept;

    const std::map<ring::LiveStream, StreamPlan>& Streams() const { return streams_; }

  private:
    void Read();

    std::string store_url_;
    std::optional<store::Store> store_;
    std::optional<std::int64_t> revision_;
    std::map<ring::LiveStream, StreamPlan> streams_;
    std::string reported_failure_;
};

}  // namespace lookhaven::recorder
