// SPDX-License-Identifier: Apache-2.0
//
// Common to both ways of playback: the opened recording, the picture last read, pacing, the check of the session.
//
// Invariants    No allocation per frame: every picture is read into one buffer and sent from it.
#pragma once

#include <memory>
#include <string>

#include "platform/output/multipartresponse.h"
#include "platform/recording/jpegextractor.h"
#include "platform/recording/pacing.h"

class FrameStream {
  public:
    // timestamp: the client's key of the channel that carries rate or position.
    explicit FrameStream(long long timestamp);

    // False when the recording cannot be played; a log line only when memory could not be allocated.
    bool Open(const std::string& path);
    JpegExtractor& GetExtractor() { return m_Extractor; }
    ProgressIndicator& GetProgress() { return m_Progress; }
    int GetLastIndex() const;

    // Keeps the frame's picture for SendPicture; false when it cannot be read.
    bool Read(int index);
    // Each writes one part. Failures are ignored: a client that disconnects ends the stream by a signal.
    void SendIndex(int index);
    void SendPicture();

    // Starts pacing at the rate; a rate below 0 is slow motion by that factor. interval: 0 or more samples the
    // recording without pacing, one frame per that many seconds.
    void StartPace(int playRate, int interval);
    // Takes over the rate that the client has set, if it differs.
    void FollowRate();
    // True when this process has been told to check whether it still owns the session, and the check failed.
    bool IsSessionGone() const;
    // Waits for the next picture's time unless sampling, and returns the number of frames to advance.
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
