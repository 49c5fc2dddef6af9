// SPDX-License-Identifier: Apache-2.0
//
// Common to the loops of all live streams: when a pass may begin, how long a stream may stall, how a frame is read from
// a ring entry.
#pragma once

#include <cstdint>
#include <ctime>

#include "platform/live/livestream.h"

// The source that the live view's log lines name.
inline constexpr char kLiveviewSource[] = "liveview_src";

// Bytes of the picture or audio block in the entry; 0 or less when there is none.
inline int FrameSize(const DataEntry& entry) {
    // Unsigned, since another process writes both numbers: signed overflow would be undefined.
    return static_cast<int>(static_cast<std::uint32_t>(entry.m_Length) - static_cast<std::uint32_t>(entry.m_Offset));
}

// The block's first byte; valid until the entry is released.
inline const unsigned char* FrameData(const DataEntry& entry) {
    return reinterpret_cast<const unsigned char*>(&entry + 1) + entry.m_Offset;
}

// True for entries that a stream sends; it skips others silently.
inline bool IsFrameSizeInRange(const DataEntry& entry) {
    constexpr int kMaxFrameSize = 4194303;
    return FrameSize(entry) >= 1 && FrameSize(entry) <= kMaxFrameSize;
}

// Begin and end of each pass of a stream's loop: while (loop.BeginPass()) { … if (!loop.Rest()) break; }
// loop.LogExit();
class LiveLoop {
  public:
    // Starts the time-out. func: the streaming function, which the log lines name; must outlive this object.
    LiveLoop(int camId, const char* func);

    // False when the client has disconnected or the process is to stop. Sleeps in steps of ten seconds while the
    // recording service asks for a pause or is absent; the time-out is not checked meanwhile, but that time counts
    // toward it. Throws std::runtime_error when this thread already holds the service's lock.
    bool BeginPass() const;
    // Flushes standard output. A failure is only logged: BeginPass ends the loop.
    void Flush() const;
    // Restarts the time-out.
    void NoteWrite();
    // Sleeps 10 ms; or returns false after a log line when the last write is more than 20 s ago.
    bool Rest() const;
    void LogExit() const;

  private:
    int m_CamId;
    const char* m_szFunc;
    std::time_t m_LastWrite;
};
