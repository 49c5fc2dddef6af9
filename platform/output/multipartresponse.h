// SPDX-License-Identifier: Apache-2.0
//
// A multipart response on standard output: response head, boundaries, part headers.
#pragma once

#include "platform/export.h"

// The constructor writes nothing: the response head goes out with the first part. Once the client has disconnected,
// writes do nothing and SIGTERM is raised in the calling process; the module relies on that and ignores what Write
// returns.
//
// Thread safety: one thread.
class LH_PLATFORM_API MultipartResponse {
  public:
    MultipartResponse();

    // Writes one part with the content type, after flushing standard output. data may be null if length is 0: an empty
    // part. extra: further part header lines, each ending in CR LF, or null. Returns 0, or -1 when the output is
    // broken.
    int Write(const char* contentType, const void* data, int length, const char* extra);
    // The same for a frame of a muxed stream, whose part headers describe the stream: codecs, decoder configuration of
    // both media, the frame's timestamp in microseconds. Configuration of more than 1024 bytes is left out.
    int Write(const char* contentType, const char* codecs, const unsigned char* videoExtra, int videoExtraLength,
              const unsigned char* audioExtra, int audioExtraLength, long long timestamp, const void* data, int length,
              const char* extra);

  private:
    bool m_blHeadSent;
};
