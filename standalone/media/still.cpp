// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/still.h"

#include <algorithm>

#include "standalone/media/frame_decoder.h"
#include "standalone/media/jpeg_encoder.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

std::vector<std::uint8_t> JpegOfKeyFrame(Codec codec, std::span<const std::uint8_t> frame) {
    const AvPtr<AVCodecContext> decoder = OpenVideoDecoder(codec);
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

}  // namespace lookhaven::media
