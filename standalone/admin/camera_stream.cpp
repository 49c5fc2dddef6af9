// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/camera_stream.h"

#include "standalone/media/source_kinds.h"

namespace lookhaven::admin {

namespace {

constexpr std::chrono::seconds kProbeTimeout{10};

}  // namespace

media::ProbeResult ProbeStream(const Prober& prober, const media::SourceKinds& kinds, const std::string& source,
                               bool insecure, const std::optional<store::Credentials>& credentials) {
    RequireSource(kinds, source);
    media::SourceOptions options{{}, kProbeTimeout, insecure};
    if (credentials) {
        options.credentials = {credentials->account, credentials->password};
    }
    return prober(source, options);
}

void FillInFromStream(CameraSetup& setup, bool knows_audio, const Prober& prober, const media::SourceKinds& kinds) {
    const store::CameraProfile* live = setup.camera.FindProfile(setup.camera.live_profile);
    if (live == nullptr) {
        return;
    }
    const media::NetworkKind* kind = media::FindNetworkKind(live->source);
    if (kind != nullptr && kind->sends_only_that) {
        setup.camera.video_type = kind->usual_codec;
        return;
    }
    const media::ProbeResult found = ProbeStream(prober, kinds, live->source, setup.camera.insecure, setup.credentials);
    if (!base::IsVideo(found.video.codec)) {
        throw store::InvalidRecord(std::string("the source sends ") + base::CodecName(found.video.codec) +
                                   ", but only MJPEG, H.264 and H.265 are supported");
    }
    setup.camera.video_type = found.video.codec;
    if (!knows_audio) {
        setup.camera.audio = found.audio.has_value();
    }
}

}  // namespace lookhaven::admin
