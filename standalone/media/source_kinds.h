// SPDX-License-Identifier: Apache-2.0
//
// The kinds of camera source. To add one of the network: write its class in a file of its own (rtsp_source.cpp shows
// how little it needs), declare its SourceOpener here, and add a row to kNetworkKinds; the compiler asks for the rest.
// It then runs confined in lookhaven-camera (camera/isolated_source.h), whose confinement must permit what it needs;
// see docs/design/cameras.md. The command line and the web API take it by themselves; in the web client, kSchemes of
// ui/settings/cameras/address.ts lists what can be typed. One of this machine, such as file:, is a row in CameraKinds
// (source_kinds.cpp), which the recorder itself reads.
#pragma once

#include <array>
#include <memory>
#include <string_view>

#include "standalone/base/video.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

// What a kind is read with.
enum class Protocol { kRtsp, kMjpegOverHttp };

struct NetworkKind {
    std::string_view beginning;  // of its addresses, up to the host
    std::string_view default_port;
    Protocol protocol;
    base::Codec usual_codec;  // taken for what its cameras send until one has been looked at
    bool sends_only_that;     // and no sound, so that nobody needs to look
    bool has_tls;             // with a certificate that is verified unless the camera's record says otherwise
};

// Needs no libav, so that request processes have it, too.
inline constexpr std::array<NetworkKind, 3> kNetworkKinds{{
    {"rtsp://", "554", Protocol::kRtsp, base::Codec::kH264, false, false},
    {"http://", "80", Protocol::kMjpegOverHttp, base::Codec::kMjpeg, true, false},
    {"https://", "443", Protocol::kMjpegOverHttp, base::Codec::kMjpeg, true, true},
}};

// Null for an address of none.
const NetworkKind* FindNetworkKind(std::string_view address);

std::unique_ptr<Source> OpenRtsp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenMjpegHttp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenFileLoop(const std::string& url, const SourceOptions& options, std::stop_token stop);

}  // namespace lookhaven::media
