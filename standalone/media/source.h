// SPDX-License-Identifier: Apache-2.0
//
// Streams of frames from cameras and files, opened by URL.
//
//   rtsp://host/path        RTSP with its media inside the TCP connection
//   http://… https://…      Motion JPEG as a multipart response
//   file:/path              a video file, played in a loop at its own pace
//
// source_kinds.h says how to add a kind.
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
#include <string_view>

#include "standalone/base/signal_loss.h"
#include "standalone/media/packet.h"

namespace lookhaven::media {

// Why a source cannot be opened or read on, in one sentence without credentials.
class SourceError : public std::runtime_error {
  public:
    explicit SourceError(const std::string& sentence, base::SignalLoss cause = base::SignalLoss::kOther)
        : std::runtime_error(sentence),
          cause_(cause) {}
    base::SignalLoss Cause() const { return cause_; }

  private:
    base::SignalLoss cause_;
};

// The login of the camera; empty when it needs none. Kept out of the URL so that no log can show it.
struct Credentials {
    std::string user;
    std::string password;

    bool operator==(const Credentials&) const = default;
};

struct SourceOptions {
    Credentials credentials;
    // A source that delivers no picture for this long fails, even while sound still flows.
    std::chrono::milliseconds no_data_limit{10'000};
    // Takes any TLS certificate, not only one for the host's name of an authority that this machine trusts.
    bool insecure = false;
};

class Source {
  public:
    Source() = default;
    Source(const Source&) = delete;
    Source& operator=(const Source&) = delete;
    virtual ~Source() = default;

    // The audio format, or nothing when the source is silent. Does not change.
    virtual const std::optional<StreamFormat>& Audio() const = 0;

    // Waits for the next packet. Throws SourceError when the source ends, stalls or fails, or on a stop request; then
    // only destroy it.
    virtual Packet Next() = 0;
};

// Opens one kind of source by its whole URL; the contract is that of OpenSource.
using SourceOpener = std::unique_ptr<Source> (*)(const std::string& url, const SourceOptions& options,
                                                 std::stop_token stop);

// The kinds of source that a program knows, by how their URLs begin.
using SourceKinds = std::map<std::string, SourceOpener>;

// Those of source_kinds.h, and "file:". A program may add others.
SourceKinds CameraKinds();

// Null for a URL of no kind, or without a host where its kind has one.
SourceOpener FindKind(const SourceKinds& kinds, std::string_view url);

// "file:, http:// or rtsp://", for messages.
std::string ListKinds(const SourceKinds& kinds);

// Connects and reads as much as is needed to know the codecs. A stop request ends this and any later wait within about
// 0.1 s, except that resolving a host name cannot be interrupted. Throws SourceError.
std::unique_ptr<Source> OpenSource(const SourceKinds& kinds, const std::string& url, const SourceOptions& options,
                                   std::stop_token stop);

}  // namespace lookhaven::media
