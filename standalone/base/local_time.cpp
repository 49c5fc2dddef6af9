// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/local_time.h"

#include <ctime>

namespace lookhaven::base {

int LocalHourOfWeek(std::int64_t time_s) {
    ::tzset();  // sees that the zone was changed while this process runs, which localtime_r does not
    const auto time = static_cast<std::time_t>(time_s);
    std::tm local{};
    ::localtime_r(&time, &local);
    return (local.tm_wday + 6) % 7 * 24 + local.tm_hour;
}

}  // namespace lookhaven::base
