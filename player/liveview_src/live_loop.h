// SPDX-License-Identifier: Apache-2.0
//
// What the loops of all live streams have in common: when a pass may begin, how long a stream may stand still, how a
// frame is read out of a ring entry.
#pragma once

#include <cstdint>
#include <ctime>

#include "platform/live/livestream.h"

// The source that the live view's log lines name.
inline constexpr char kLiveviewSource[] = "liveview_src";

// Bytes of the picture or audio block in the entry; 0 or less when there is none.
inline int FrameSize(const DataEntry& entry) {
    // Unsigned, for another process wrote both numbers.
    return static_cast<int>(static_cast<std::uint32_t>(entry.m_Length) - static_cast<std::uint32_t>(entry.m_Offset));
}

// The block's first byte; valid as long as the entry.
inline const unsigned char* FrameData(const DataEntry& entry) {
    return reinterpret_cast<const unsigned char*>(&entry + 1) + entry.m_Offset;
}

// True when a stream sends the entry; others are skipped without a word.
inline bool IsFrameSizeInRange(const DataEntry& entry) {
    constexpr int kMaxFrameSize = 4194303;
    return FrameSize(entry) >= 1 && FrameSize(entry) <= kMaxFrameSize;
}

// The frame of one stream's loop: while (loop.BeginPass()) { … if (!loop.Rest()) break; } loop.LogExit();
class LiveLoop {
  public:
    // Starts the time-out. func: the streaming function, which the log lines name; kept.
    LiveLoop(int camId, const char* func);

    // False when the client is gone or the process is to stop. Holds the stream in ten-second sleeps while the recording
    // service says pause or says nothing; no time-out is counted meanwhile, but the time counts after it.
    // Throws std::runtime_error when this thread already holds the service's lock.
    bool BeginPass() const;
    // Flushes standard output. A failure is only logged: the next pass sees why.
    void Flush() const;
    // Starts the time-out anew.
    void NoteWrite();
    // Sleeps 10 ms, or returns false after a log line when more than 20 s went by since the last write.
    bool Rest() const;
    void LogExit() const;

  private:
    int m_CamId;
    const char* m_szFunc;
    std::time_t m_LastWrite;
};
