// SPDX-License-Identifier: Apache-2.0
//
// The rings of one live stream: pictures, and the sound that goes with them.
//
// Invariants    (1) The audio ring exists before the first picture can be found, since viewers look for both. A stream
//               in another codec than MJPEG has one even when it is silent.
//               (2) Both rings begin and end their runs together.
// Thread safety One thread.
#pragma once

#include <optional>

#include "standalone/base/installation.h"
#include "standalone/control/demand.h"
#include "standalone/media/packet.h"
#include "standalone/ring/writer.h"

namespace lookhaven::recorder {

class StreamRings {
  public:
    // Creates nothing yet. The installation must outlive this object.
    StreamRings(const base::Installation& installation, control::LiveStream stream)
        : installation_(installation),
          stream_(stream) {}

    // Appends the packet; a packet of another format than before moves the stream to a new ring of a fitting size. The
    // first packet of a run is a picture. audio is the format of the sound that goes with it. Throws std::exception
    // when the rings cannot be made.
    void Write(const media::Packet& packet, const std::optional<media::StreamFormat>& audio);

    // The source failed: viewers find none of its frames any more, and wait for the next run.
    void EndRun();

    // Retires the rings: viewers' streams end. The next packet makes new ones.
    void Close();

    // Heartbeat: the writer is alive although no frame comes. Call once a second meanwhile.
    void Beat();

  private:
    struct Ring {
        ring::StreamFormat format;
        ring::Writer writer;
    };

    void OpenAudio(const std::optional<media::StreamFormat>& audio, base::Codec video_codec);
    void Open(std::optional<Ring>& ring, base::Medium medium, const ring::StreamFormat& format,
              const ring::StreamEstimate& estimate);

    const base::Installation& installation_;
    control::LiveStream stream_;
    std::optional<Ring> video_;
    std::optional<Ring> audio_;
    std::optional<media::StreamFormat> video_format_;  // of this run
};

}  // namespace lookhaven::recorder
