// SPDX-License-Identifier: Apache-2.0
//
// Retention limits: in records, and the question before a lower one has recordings deleted, which the recorder
// does within seconds.
#pragma once

#include <cstdint>
#include <stdexcept>

#include <json/json.h>

#include "standalone/maintenance/retention.h"

namespace lookhaven::admin {

// The age limit as records have it: days, or null for 0 seconds, which is none.
inline Json::Value DaysJson(std::int64_t max_age_s) {
    constexpr double kDayS = 86'400;
    return max_age_s > 0 ? Json::Value(static_cast<double>(max_age_s) / kDayS) : Json::Value();
}

// A lower limit would have these recordings deleted; nothing was changed.
class DeletesRecordings : public std::runtime_error {
  public:
    explicit DeletesRecordings(const maintenance::RetentionForecast& loss)
        : std::runtime_error("this limit deletes recordings"),
          loss_(loss) {}
    const maintenance::RetentionForecast& Loss() const { return loss_; }

  private:
    maintenance::RetentionForecast loss_;
};

// 0 is no limit.
inline bool IsLower(std::int64_t after, std::int64_t before) {
    return after != 0 && (before == 0 || after < before);
}

// Throws DeletesRecordings where more recordings go by the limits after a change than by those before it. forecast:
// the maintenance::RetentionForecast of such limits.
template <typename Limits, typename Forecast>
void RequireNoLoss(const Limits& before, const Limits& after, Forecast forecast) {
    const maintenance::RetentionForecast loss = forecast(after);
    if (loss.events > 0 && loss.events > forecast(before).events) {
        throw DeletesRecordings(loss);
    }
}

}  // namespace lookhaven::admin
