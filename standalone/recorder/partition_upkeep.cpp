// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/partition_upkeep.h"

#include "standalone/base/clock.h"
#include "standalone/store/month_partitions.h"

namespace lookhaven::recorder {

namespace {

constexpr std::int64_t kMinuteUs = 60'000'000;
constexpr std::int64_t kPauseUs = 60 * kMinuteUs;
constexpr std::int64_t kPauseAfterFailureUs = 10 * kMinuteUs;

}  // namespace

PartitionUpkeep::PartitionUpkeep(const std::string& store_url)
    : next_us_(base::MonotonicMicros() + kPauseAfterFailureUs) {
    if (!store_url.starts_with("sqlite:")) {
        thread_.emplace(store_url, "make and drop partitions of the store",
                        [this](store::Store& store, const std::stop_token&) {
                            store::MaintainPartitions(store);
                            next_us_ = base::MonotonicMicros() + kPauseUs;
                        });
    }
}

void PartitionUpkeep::Ask() {
    const std::int64_t now_us = base::MonotonicMicros();
    if (thread_ && now_us >= next_us_) {
        next_us_ = now_us + kPauseAfterFailureUs;
        thread_->Ask();
    }
}

void PartitionUpkeep::RequestStop() {
    if (thread_) {
        thread_->RequestStop();
    }
}

}  // namespace lookhaven::recorder
