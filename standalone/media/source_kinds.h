// SPDX-License-Identifier: Apache-2.0
//
// The kinds of camera source. To add one: write its class in a file of its own (rtsp_source.cpp shows how little it
// needs), declare its SourceOpener here, and name it in source_kinds.cpp. A kind that begins with "…://" runs confined
// in lookhaven-camera (camera/isolated_source.cpp); see docs/design/cameras.md. The web API, which runs without libav,
// takes those of camera::NetworkKinds (camera/isolated_source.h), with the ports in api/camera_fields.cpp; the client
// lets no other be typed than those in client/src/ui/settings/cameras/address.ts.
#pragma once

#include <memory>

#include "standalone/media/source.h"

namespace lookhaven::media {

std::unique_ptr<Source> OpenRtsp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenMjpegHttp(const std::string& url, const SourceOptions& options, std::stop_token stop);
std::unique_ptr<Source> OpenFileLoop(const std::string& url, const SourceOptions& options, std::stop_token stop);

}  // namespace lookhaven::media
