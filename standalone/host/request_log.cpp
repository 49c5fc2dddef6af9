// SPDX-License-Identifier: Apache-2.0
#include "standalone/host/request_log.h"

#include <string>

#include "standalone/base/concat.h"
#include "standalone/base/log.h"

namespace lookhaven::host {

namespace {

std::string_view OrDash(std::string_view text) {
    return text.empty() ? "-" : text;
}

}  // namespace

bool RequestLog::IsOn() {
    if (levels_ == nullptr) {
        levels_ = control::MapDebugLog(installation_);
    }
    return levels_ != nullptr && levels_->category_level[control::kRequestsCategory] >= control::kDebugLevel;
}

void RequestLog::Note(const control::Slot& slot, std::string_view address, int status, std::chrono::microseconds took) {
    if (!IsOn()) {
        return;
    }
    // Last, for the slot is its process's to write: it cannot pass for more than an account.
    const std::string_view account = control::AccountOf(slot);
    base::SetLogAccount(account);
    base::LogInfo(base::Concat("request: ", OrDash(control::CallOf(slot)), " from ", OrDash(address), ": ",
                               status == 0 ? "died" : std::to_string(status), " after ", took.count() / 1000,
                               " ms, account ", OrDash(account)));
    base::SetLogAccount({});
}

}  // namespace lookhaven::host
