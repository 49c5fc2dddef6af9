// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/clock_watch.h"

#include <cstdlib>

namespace lookhaven::maintenance {

bool ClockWatch::IsTrusted(std::int64_t monotonic_us, std::int64_t wall_s) {
    const std::int64_t offset_s = wall_s - monotonic_us / 1'000'000;
    if (!offset_s_ || std::abs(offset_s - *offset_s_) > kMaxTrustedStepS) {
        steady_since_us_ = monotonic_us;
    }
    offset_s_ = offset_s;
    return monotonic_us - steady_since_us_ >= kMinSteadyUs;
}

}  // namespace lookhaven::maintenance
