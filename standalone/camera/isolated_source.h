// SPDX-License-Identifier: Apache-2.0
//
// Cameras as sources whose bytes are parsed in a confined process of their own.
#pragma once

#include <memory>
#include <string>

#include "standalone/media/source.h"

namespace lookhaven::camera {

// A media::SourceOpener. The source belongs to the thread that opens it, which must not end before: its process ends
// with either of them. A stop request ends any wait at once, also for the resolution of a host name.
std::unique_ptr<media::Source> OpenIsolated(const std::string& url, const media::SourceOptions& options,
                                            std::stop_token stop);

// The kinds of the network, isolated; needs no libav.
media::SourceKinds NetworkKinds();

// media::CameraKinds, in which the kinds of the network are isolated.
media::SourceKinds IsolatedKinds();

}  // namespace lookhaven::camera
