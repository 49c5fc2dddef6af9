// SPDX-License-Identifier: Apache-2.0
//
// Streams of frames from cameras and files, opened by URL.
//
//   rtsp://host/path        RTSP with its media inside the TCP connection
//   http://… https://…      Motion JPEG as a multipart answer
//   file:/path              a recording, played over and over at its own pace
//
// Thread safety: one thread per source; any number of sources.
#pragma once

#include <chrono>
#include <map>
#include <memory>
#include <optional>
#include <stdexcept>
#include <stop_token>
#include <string>

#include "standalone/media/packet.h"

namespace lookhaven::media {

// Why a source cannot be opened or read on, in one sentence without credentials.
class SourceError : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

// What the camera wants to know; empty when it asks nobody. Kept apart from the URL so that no log can show it.
struct Credentials {
    std::string user;
    std::string password;

    bool operator==(const Credentials&) const = default;
};

struct SourceOptions {
    Credentials credentials;
    // A source that has no picture for so long fails, even while other data still flows.
    std::chrono::milliseconds no_data_limit{10'000};
};

class Source {
  public:
    Source() = default;
    Source(const Source&) = delete;
    Source& operator=(const Source&) = delete;
    virtual ~Source() = default;

    // The sound's format, or nothing when the source is silent. Does not change.
    virtual const std::optional<StreamFormat>& Audio() const = 0;

    // Waits for the next packet. Throws SourceError when the source ends, stalls, breaks or is told to stop; then the
    // source is of no further use.
    virtual Packet Next() = 0;
};

// Opens one kind of source by its whole URL, under the conditions of OpenSource.
using SourceOpener = std::unique_ptr<Source> (*)(const std::string& url, const SourceOptions& options,
                                                 std::stop_token stop);

// The kinds of source that a program knows, by the scheme of their URLs.
using SourceKinds = std::map<std::string, SourceOpener>;

// rtsp, http, https and file. A program may add its own.
SourceKinds CameraKinds();

// Connects and reads as much as is needed to know the codecs. A stop request ends this and any later wait within about
// 0.1 s; only the look-up of a host name cannot be cut short. Throws SourceError.
std::unique_ptr<Source> OpenSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options,
                                   std::stop_token stop);

}  // namespace lookhaven::media
