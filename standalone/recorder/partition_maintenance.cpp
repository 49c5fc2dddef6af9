// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/partition_maintenance.h"

#include "standalone/base/clock.h"
#include "standalone/store/month_partitions.h"

namespace lookhaven::recorder {

namespace {

constexpr std::int64_t kMinuteUs = 60'000'000;
constexpr std::int64_t kIntervalUs = 60 * kMinuteUs;
constexpr std::int64_t kRetryUs = 10 * kMinuteUs;  // where the store cannot be opened

}  // namespace

PartitionMaintenance::PartitionMaintenance(const std::string& store_url)
    : next_us_(base::MonotonicMicros() + kRetryUs) {
    if (!store_url.starts_with("sqlite:")) {
        const auto work = [this](store::Store& store, const std::stop_token& stop) {
            // Also after a failure: each attempt may block others for seconds, and there is a month for it.
            next_us_ = base::MonotonicMicros() + kIntervalUs;
            store::MaintainPartitions(store, stop);
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
