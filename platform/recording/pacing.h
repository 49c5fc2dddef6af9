// SPDX-License-Identifier: Apache-2.0
//
// The pace of a playback: its clock, and the channel on which a client changes it or follows it.
#pragma once

#include <cstdint>
#include <memory>

#include "platform/export.h"

// Waits out what is left of each period, measured from an absolute start, so that errors do not add up.
class LH_PLATFORM_API DelayTimer {
  public:
    // The period in microseconds; taken as 1 ms … 10 s.
    explicit DelayTimer(int delayUs);

    // The next period is as long as this; the start of the running one stays.
    void SetDelayTime(int delayUs);
    // The first period starts now.
    void BeginTiming();
    // Returns when the running period is over, or at a signal. More than one period late, the next starts now.
    void Delay();

  private:
    std::int64_t m_DelayUs;
    std::int64_t m_DueUs;
};

// One number that a player and its client share under the client's stream key: the play rate, or the position in
// milliseconds. The key belongs to the session that used it first; another session's is refused.
class LH_PLATFORM_API ProgressIndicator {
  public:
    // create: makes the channel when it is missing. owner: it is this process's; what an earlier player left is cleared.
    ProgressIndicator(long long key, bool create, bool owner);
    ProgressIndicator(const ProgressIndicator&) = delete;
    ProgressIndicator& operator=(const ProgressIndicator&) = delete;
    ~ProgressIndicator();

    // Publishes the number. Returns 0; non-zero when the channel is gone or refused, which it stays.
    int Set(int value);
    // The number, -1 when there is none or the channel is refused.
    int Get();

  private:
    struct Channel;

    std::unique_ptr<Channel> m_pChannel;
};
