// SPDX-License-Identifier: Apache-2.0
//
// The recording service of this host, and the right to use the application.
#include <utility>

#include "platform/admission/host.h"
#include "platform/admission/pairauth.h"
#include "platform/live/commoncfg.h"
#include "standalone/base/clock.h"
#include "standalone/binding/common_record.h"
#include "standalone/binding/request.h"
#include "standalone/binding/request_context.h"
#include "standalone/control/common_config.h"
#include "standalone/store/users.h"

namespace control = lookhaven::control;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

static_assert(sizeof(LHShmCommonCfg) == sizeof(control::CommonConfig));
static_assert(offsetof(LHShmCommonCfg, m_Timestamp) == offsetof(control::CommonConfig, timestamp_sec));
static_assert(offsetof(LHShmCommonCfg, m_blPause) == offsetof(control::CommonConfig, paused));

namespace {

control::CommonConfig* g_record = nullptr;

// Mapped once; asked again only while there is none, since the record may come later.
control::CommonConfig* CommonRecord() {
    if (g_record == nullptr) {
        g_record = OrFailure<control::CommonConfig*>("common configuration", nullptr, [] {
            return control::MapCommonConfig(RequestContext::Current().Installation());
        });
    }
    return g_record;
}

}  // namespace

void lookhaven::binding::ReleaseCommonRecord() {
    if (control::CommonConfig* record = std::exchange(g_record, nullptr); record != nullptr) {
        control::UnmapCommonConfig(record);
    }
}

LHShmCommonCfg* LHShmCommonCfgAt() {
    return reinterpret_cast<LHShmCommonCfg*>(CommonRecord());
}

long GetMonoTimeSec() {
    return static_cast<long>(lookhaven::base::MonotonicMicros() / 1'000'000);
}

bool IsLHRunning() {
    control::CommonConfig* record = CommonRecord();
    return record != nullptr && control::IsRecorderAlive(*record);
}

// The default task set is every processor, where a process runs anyway; there are no others.
void LHTaskSet::SetAffinity(const std::string&) {}

bool SDKUser::AppPrivUserHas(const std::string& userName, const std::string& application, const std::string&) {
    return application == lookhaven::binding::kApplication && OrFailure("AppPrivUserHas", false, [&] {
               return lookhaven::store::Users(RequestContext::Current().Records()).FindByName(userName).has_value();
           });
}
