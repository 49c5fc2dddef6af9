// SPDX-License-Identifier: Apache-2.0
//
// What both ways of playback do alike: the opened recording, the picture last read, the pace, the check of the session.
//
// Invariants    No frame allocates: one buffer takes each picture, and each is sent from it.
#pragma once

#include <memory>
#include <string>

#include "platform/output/multipartresponse.h"
#include "platform/recording/jpegextractor.h"
#include "platform/recording/pacing.h"

class FrameStream {
  public:
    // timestamp: the client's key of the channel on which rate or position travel.
    explicit FrameStream(long long timestamp);

    // False when the recording cannot be played, after a log line when it was for want of memory.
    bool Open(const std::string& path);
    JpegExtractor& GetExtractor() { return m_Extractor; }
    ProgressIndicator& GetProgress() { return m_Progress; }
    int GetLastIndex() const;

    // Keeps the frame's picture for SendPicture; false when it cannot be read.
    bool Read(int index);
    // Each is one part, whose way to the client is not looked at: a client that has gone ends the process by a signal.
    void SendIndex(int index);
    void SendPicture();

    // Begins to play at the rate; below 0 it is slow motion by that factor. interval: 0 or more samples the recording
    // unpaced, one frame for each so many seconds.
    void StartPace(int playRate, int interval);
    // Takes the rate that the client has set, if it is another.
    void FollowRate();
    // True when this process has been told to check whether it still has the session, and cannot.
    bool IsSessionGone() const;
    // Waits for the next picture's time unless sampling, and gives the number of frames to it.
    int NextStride();

  private:
    struct Free {
        void operator()(void* memory) const;
    };

    void SetRate(int rate);

    JpegExtractor m_Extractor;
    ProgressIndicator m_Progress;
    DelayTimer m_Timer;
    MultipartResponse m_Multipart;
    __tag_JPEG_FRAME_INFO m_Info = {};
    std::unique_ptr<unsigned char, Free> m_pBuffer;
    int m_Length = 0;
    int m_Rate = 1;
    bool m_blPaced = true;
    int m_Step = 1;
};
