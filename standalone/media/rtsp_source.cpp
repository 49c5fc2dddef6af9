// SPDX-License-Identifier: Apache-2.0
//
// A camera that speaks RTSP, with its media inside the TCP connection.
#include "standalone/base/clock.h"
#include "standalone/media/demuxer.h"
#include "standalone/media/pace.h"
#include "standalone/media/source_kinds.h"
#include "standalone/media/source_url.h"

namespace lookhaven::media {

namespace {

AvOptions& SetRtspOptions(AvOptions& options) {
    return options.Set("rtsp_transport", "tcp")
        .Set("protocol_whitelist", "rtsp,rtp,tcp")
        .Set("user_agent", "lookhaven");
}

class RtspSource : public Source {
  public:
    RtspSource(const std::string& url, const SourceOptions& options, std::stop_token stop)
        : deadline_(std::move(stop), options.no_data_limit),
          demuxer_(WithCredentials(url, options.credentials), SetRtspOptions(av_options_), deadline_,
                   Demuxer::Framing::kPieces) {}

    const std::optional<StreamFormat>& Audio() const override { return demuxer_.Audio(); }

    Packet Next() override {
        std::optional<Packet> packet = demuxer_.Read();
        if (!packet) {
            throw SourceError("the camera ended the stream");
        }
        packet->timestamp_us = timeline_.Map(packet->timestamp_us, base::MonotonicMicros(),
                                             packet->medium == Medium::kVideo && packet->key_frame);
        return *packet;
    }

  private:
    Deadline deadline_;
    AvOptions av_options_;
    Demuxer demuxer_;
    Timeline timeline_;
};

}  // namespace

std::unique_ptr<Source> OpenRtsp(const std::string& url, const SourceOptions& options, std::stop_token stop) {
    return std::make_unique<RtspSource>(url, options, std::move(stop));
}

}  // namespace lookhaven::media
