// SPDX-License-Identifier: Apache-2.0
//
// A recording as a sequence of JPEG pictures, whatever its codec.
#pragma once

#include <memory>
#include <string>

#include "platform/export.h"

struct __tag_JPEG_FRAME_INFO {
    float m_FrameRate;  // frames per second, 1 … 1000; the module plays nothing at exactly 0
    int m_FrameCount;   // of a growing recording, the frames on the mount at the time of the call
};

// Frames are numbered from 0 in presentation order. Where a call returns a status, 0 is success. Init comes first.
class LH_PLATFORM_API JpegExtractor {
  public:
    JpegExtractor();
    JpegExtractor(const JpegExtractor&) = delete;
    JpegExtractor& operator=(const JpegExtractor&) = delete;
    ~JpegExtractor();

    // Opens the recording. Non-zero when it cannot be read or is none.
    int Init(const std::string& path);
    int GetFrameInfo(__tag_JPEG_FRAME_INFO& info);
    // Stores the frame's picture. length: on entry the size of the buffer, on success the size of the picture. Non-zero
    // for an index below 0 or past the end, a picture larger than the buffer, and a frame that cannot be decoded. At
    // the end of a growing recording it may wait up to 2 s for the frame; a repeated index is answered no sooner than
    // 200 ms after the last. Any signal ends a wait.
    int ReadFrame(int index, unsigned char* buffer, int& length);
    // The index of the last frame at or before the time, in milliseconds from the start of the recording; -1 for a time
    // below 0. Past the end the last index, but of a growing recording the index that the time would have.
    int GetFrameIdx(int timeMs);
    // The time of the frame in milliseconds from the start of the recording; GetFrameIdx(GetTimeMS(index)) is index.
    int GetTimeMS(int index);

  private:
    struct Recording;

    std::unique_ptr<Recording> m_pRecording;
};
