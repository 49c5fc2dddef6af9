// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/retention_text.h"

#include "standalone/cli/console.h"
#include "standalone/cli/units.h"

namespace lookhaven::cli {

std::string MaxAgeText(const Json::Value& seconds) {
    return seconds.asInt64() == 0 ? "none" : FormatDuration(seconds.asInt64());
}

void AskToConfirm(const admin::DeletesRecordings& refusal) {
    const maintenance::RetentionForecast& loss = refusal.Loss();
    throw Failure(kDataError, "this limit deletes the ", loss.events, " oldest recordings (", FormatSize(loss.bytes),
                  "), up to ", FormatMoment(loss.end_s), "; add --yes to confirm");
}

}  // namespace lookhaven::cli
