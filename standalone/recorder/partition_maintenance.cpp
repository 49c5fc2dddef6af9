// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/partition_maintenance.h"

#include <algorithm>

#include "standalone/base/clock.h"
#include "standalone/store/month_partitions.h"

namespace lookhaven::recorder {

namespace {

constexpr std::int64_t kMinuteUs = 60'000'000;
constexpr std::int64_t kIntervalUs = 60 * kMinuteUs;
constexpr std::int64_t kMaxIntervalUs = 24 * kIntervalUs;
constexpr std::int64_t kRetryUs = 10 * kMinuteUs;  // where the store cannot be opened

}  // namespace

PartitionMaintenance::PartitionMaintenance(const std::string& store_url)
    : next_us_(base::MonotonicMicros() + kRetryUs),
      interval_us_(kIntervalUs) {
    if (!store_url.starts_with("sqlite:")) {
        const auto work = [this](store::Store& store, const std::stop_token& stop) {
            // After a failure less and less often: each attempt may block others for seconds, and has a month.
            next_us_ = base::MonotonicMicros() + interval_us_;
            interval_us_ = std::min(2 * interval_us_, kMaxIntervalUs);
            store::MaintainPartitions(store, stop);
            interval_us_ = kIntervalUs;
            next_us_ = base::MonotonicMicros() + kIntervalUs;
        };
        thread_.emplace(store_url, "maintain the store's partitions", work, StoreThread::Idle::kCloses);
    }
}

void PartitionMaintenance::Ask() {
    const std::int64_t now_us = base::MonotonicMicros();
    if (thread_ && now_us >= next_us_) {
        next_us_ = now_us + kRetryUs;
        thread_->Ask();
    }
}

void PartitionMaintenance::RequestStop() {
    if (thread_) {
        thread_->RequestStop();
    }
}

}  // namespace lookhaven::recorder
