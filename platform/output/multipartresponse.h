// SPDX-License-Identifier: Apache-2.0
//
// A multipart answer on standard output: response head, boundaries, part heads.
#pragma once

#include "platform/export.h"

// Constructing writes nothing: the response head goes out with the first part. Once the client is gone every write does
// nothing, and SIGTERM is raised in the own process.
//
// Thread safety: one thread.
class LH_PLATFORM_API MultipartResponse {
  public:
    MultipartResponse();

    // Writes one part with the content type, after flushing standard output. data may be null with length 0: an empty
    // part. extra: further part head lines, each ending in CR LF, or null. Returns 0, or -1 when the output is broken.
    int Write(const char* contentType, const void* data, int length, const char* extra);
    // The same for a frame of a muxed stream, whose part head describes the stream: codecs, decoder configuration of both
    // media, the frame's timestamp in microseconds. Configuration above 1024 bytes is left out.
    int Write(const char* contentType, const char* codecs, const unsigned char* videoExtra, int videoExtraLength,
              const unsigned char* audioExtra, int audioExtraLength, long long timestamp, const void* data, int length,
              const char* extra);

  private:
    bool m_blHeadSent;
};
