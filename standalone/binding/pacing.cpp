// SPDX-License-Identifier: Apache-2.0
#include "platform/recording/pacing.h"

#include <algorithm>
#include <optional>

#include <time.h>

#include "standalone/base/clock.h"
#include "standalone/binding/player_end.h"
#include "standalone/binding/request_context.h"
#include "standalone/control/progress_file.h"

using lookhaven::base::MonotonicMicros;
using lookhaven::binding::LeavePlayerFile;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;
using lookhaven::control::ProgressFile;

namespace {

constexpr std::int64_t kMinDelayUs = 1'000;
constexpr std::int64_t kMaxDelayUs = 10'000'000;

std::int64_t Bounded(int delay_us) {
    return std::clamp<std::int64_t>(delay_us, kMinDelayUs, kMaxDelayUs);
}

}  // namespace

DelayTimer::DelayTimer(int delayUs) : m_DelayUs(Bounded(delayUs)), m_DueUs(0) {}

void DelayTimer::SetDelayTime(int delayUs) {
    m_DueUs += Bounded(delayUs) - m_DelayUs;
    m_DelayUs = Bounded(delayUs);
}

void DelayTimer::BeginTiming() {
    m_DueUs = MonotonicMicros() + m_DelayUs;
}

void DelayTimer::Delay() {
    if (MonotonicMicros() - m_DueUs > m_DelayUs) {
        return BeginTiming();  // making up for the lost time would be a burst
    }
    const timespec due{m_DueUs / 1'000'000, static_cast<long>(m_DueUs % 1'000'000 * 1'000)};
    ::clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &due, nullptr);
    m_DueUs += m_DelayUs;
}

struct ProgressIndicator::Channel {
    std::optional<ProgressFile> file;
};

ProgressIndicator::ProgressIndicator(long long key, bool create, bool owner) : m_pChannel(std::make_unique<Channel>()) {
    OrFailure("ProgressIndicator", 0, [&] {
        RequestContext& context = RequestContext::Current();
        if (owner) {
            context.NotePlayer(key);  // first: the host sweeps the files of the players that it knows
        }
        if (!context.Session().empty()) {
            const std::filesystem::path folder = context.Installation().ProgressFolder();
            m_pChannel->file = create || owner ? ProgressFile::Own(folder, key, context.Session())
                                               : ProgressFile::Open(folder, key, context.Session());
        }
        return 0;
    });
}

ProgressIndicator::~ProgressIndicator() = default;

int ProgressIndicator::Set(int value) {
    if (m_pChannel->file && m_pChannel->file->Set(value)) {
        return 0;
    }
    LeavePlayerFile();  // the player ends at once
    return -1;
}

int ProgressIndicator::Get() {
    return m_pChannel->file ? m_pChannel->file->Get() : ProgressFile::kUnset;
}
