// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/still.h"

#include <algorithm>
#include <string>

#include "standalone/media/frame_decoder.h"
#include "standalone/media/jpeg_encoder.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr int kMaxHalvings = 3;

std::vector<std::uint8_t> Jpeg(Codec codec, std::span<const std::uint8_t> frame, int halvings) {
    const AvPtr<AVCodecContext> decoder = OpenVideoDecoder(codec, 1, halvings);
    const AvPtr<AVPacket> packet = OwnAv(av_packet_alloc());
    CheckAv(av_new_packet(packet.get(), static_cast<int>(frame.size())), "cannot hold the frame");
    std::copy(frame.begin(), frame.end(), packet->data);
    CheckAv(avcodec_send_packet(decoder.get(), packet.get()), "cannot decode");
    CheckAv(avcodec_send_packet(decoder.get(), nullptr), "cannot decode");
    const AvPtr<AVFrame> picture = OwnAv(av_frame_alloc());
    CheckAv(avcodec_receive_frame(decoder.get(), picture.get()), "cannot decode");
    JpegEncoder encoder;
    const std::span<const std::uint8_t> jpeg = encoder.Encode(*picture);
    return {jpeg.begin(), jpeg.end()};
}

}  // namespace

std::vector<std::uint8_t> JpegOfKeyFrame(Codec codec, std::span<const std::uint8_t> frame, std::size_t max_bytes) {
    const int max_halvings = codec == Codec::kMjpeg ? kMaxHalvings : 0;
    for (int halvings = 0; halvings <= max_halvings; ++halvings) {
        std::vector<std::uint8_t> jpeg = Jpeg(codec, frame, halvings);
        if (jpeg.size() <= max_bytes) {
            return jpeg;
        }
    }
    throw SourceError("a picture of " + std::to_string(frame.size()) + " bytes is too large");
}

}  // namespace lookhaven::media
