// SPDX-License-Identifier: Apache-2.0
//
// Playback pacing: its clock, and the channel on which a client changes the rate or follows the position.
#pragma once

#include <cstdint>
#include <memory>

#include "platform/export.h"

// Waits for the end of each period, measured from an absolute start, so that errors do not accumulate.
class LH_PLATFORM_API DelayTimer {
  public:
    // The period in microseconds; taken as 1 ms … 10 s.
    explicit DelayTimer(int delayUs);

    // Changes the length of the running period and of those after it; the start of the running one stays.
    void SetDelayTime(int delayUs);
    // The first period starts now.
    void BeginTiming();
    // Returns at the end of the running period, or at a signal. When more than one period late it returns at once and
    // the next period starts now: lost time is not made up.
    void Delay();

  private:
    std::int64_t m_DelayUs;
    std::int64_t m_DueUs;
};

// One number that a player and its client share under the client's stream key: the play rate, or the position in
// milliseconds. A key belongs to the session that used it first; access by another session is refused.
class LH_PLATFORM_API ProgressIndicator {
  public:
    // create: makes the channel if it is missing. owner: takes it over and clears the value that an earlier player
    // left. A refusal or failure shows in Set and Get only.
    ProgressIndicator(long long key, bool create, bool owner);
    ProgressIndicator(const ProgressIndicator&) = delete;
    ProgressIndicator& operator=(const ProgressIndicator&) = delete;
    ~ProgressIndicator();

    // Publishes the number. Returns 0; non-zero when the channel is gone or refused, for good.
    int Set(int value);
    // The number; -1 when there is none, or the channel is gone or refused.
    int Get();

  private:
    struct Channel;

    std::unique_ptr<Channel> m_pChannel;
};
