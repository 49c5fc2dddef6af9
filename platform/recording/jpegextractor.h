// SPDX-License-Identifier: Apache-2.0
//
// A recording as a sequence of JPEG pictures, whatever its codec.
#pragma once

#include <memory>
#include <string>

#include "platform/export.h"

struct __tag_JPEG_FRAME_INFO {
    float m_FrameRate;  // frames per second: 1 … 1000 on success
    int m_FrameCount;   // of a recording that grows, the frames on the mount when it was asked
};

// Frames are numbered from 0 in the order in which they are shown. Where a call returns a status, 0 is success.
class LH_PLATFORM_API JpegExtractor {
  public:
    JpegExtractor();
    JpegExtractor(const JpegExtractor&) = delete;
    JpegExtractor& operator=(const JpegExtractor&) = delete;
    ~JpegExtractor();

    // Opens the recording. Non-zero when it cannot be read or is none.
    int Init(const std::string& path);
    int GetFrameInfo(__tag_JPEG_FRAME_INFO& info);
    // Stores the frame's picture. length: on entry the buffer's bytes, on success the picture's. Non-zero for an index
    // below 0 or past the end, a picture larger than the buffer, and a frame that cannot be decoded. A recording that
    // grows may wait up to 2 s for its next frame; a repeated index is answered no sooner than 200 ms after the last.
    // Any signal cuts a wait short.
    int ReadFrame(int index, unsigned char* buffer, int& length);
    // The index of the last frame at or before the time, in milliseconds of the recording; -1 for a time below 0; past
    // the end the last index, and while the recording grows the index that the time would have.
    int GetFrameIdx(int timeMs);
    // The time of the frame, milliseconds of the recording; GetFrameIdx(GetTimeMS(index)) is index.
    int GetTimeMS(int index);

  private:
    struct Recording;

    std::unique_ptr<Recording> m_pRecording;
};
