// SPDX-License-Identifier: Apache-2.0
//
// What is known of a camera by looking at its stream.
#pragma once

#include <functional>
#include <string>

#include "standalone/admin/cameras.h"
#include "standalone/media/probe.h"

namespace lookhaven::admin {

// How a program opens a source: where camera bytes are parsed is its to decide. Throws media::SourceError.
using Prober = std::function<media::ProbeResult(const std::string& source, const media::SourceOptions& options)>;

// Waits ten seconds for a picture. Throws media::SourceError, and InvalidRecord as RequireSource does.
media::ProbeResult ProbeStream(const Prober& prober, const media::SourceKinds& kinds, const std::string& source,
                               bool insecure, const std::optional<store::Credentials>& credentials);

// Sets the codec of the live profile, and whether it has sound unless the owner has said so. A source whose address
// tells its codec is not opened. Throws as ProbeStream, and InvalidRecord for a codec that is not supported.
void FillInFromStream(CameraSetup& setup, bool knows_audio, const Prober& prober, const media::SourceKinds& kinds);

}  // namespace lookhaven::admin
