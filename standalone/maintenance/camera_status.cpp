// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/camera_status.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <optional>
#include <sstream>
#include <utility>

#include "standalone/base/file.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::array<std::pair<RecordingState, const char*>, 8> kNames{{
    {RecordingState::kReady, "ready"},
    {RecordingState::kRecording, "recording"},
    {RecordingState::kDiskFull, "disk-full"},
    {RecordingState::kDiskFails, "disk-fails"},
    {RecordingState::kMountGone, "mount-gone"},
    {RecordingState::kNoMount, "no-mount"},
    {RecordingState::kNoEventId, "no-event-id"},
    {RecordingState::kNoSignal, "no-signal"},
}};

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "recordings";
}

std::string WithoutBreaks(std::string text) {
    std::ranges::replace_if(
        text, [](char c) { return c == '\n' || c == '\t'; }, ' ');
    return text;
}

// Nothing for a line that an older recorder wrote.
std::optional<CameraStatus> Parse(const std::string& line) {
    std::istringstream fields(line);
    CameraStatus status;
    std::string state;
    std::string loss;
    if (!(fields >> status.camera >> state >> status.event >> status.dropped_frames >> status.lost_since_s >> loss)) {
        return std::nullopt;
    }
    const auto* const name = std::ranges::find(kNames, state, &std::pair<RecordingState, const char*>::second);
    const std::optional<base::SignalLoss> known_loss = base::SignalLossOf(loss);
    if (name == kNames.end() || !known_loss) {
        return std::nullopt;
    }
    status.state = name->first;
    status.loss = *known_loss;
    std::getline(fields.ignore(), status.camera_name, '\t');
    std::getline(fields, status.loss_reason);
    return status;
}

}  // namespace

const char* NameOf(RecordingState state) {
    return std::ranges::find(kNames, state, &std::pair<RecordingState, const char*>::first)->second;
}

void WriteCameraStatus(const base::Installation& installation, const std::vector<CameraStatus>& cameras) {
    std::ostringstream text;
    for (const CameraStatus& each : cameras) {
        text << each.camera << ' ' << NameOf(each.state) << ' ' << each.event << ' ' << each.dropped_frames << ' '
             << each.lost_since_s << ' ' << base::NameOf(each.loss) << ' ' << WithoutBreaks(each.camera_name) << '\t'
             << WithoutBreaks(each.loss_reason) << '\n';
    }
    base::WriteFileAtomically(PathOf(installation), text.str());
}

std::vector<CameraStatus> ReadCameraStatus(const base::Installation& installation) {
    std::vector<CameraStatus> cameras;
    std::error_code ignored;
    if (!std::filesystem::exists(PathOf(installation), ignored)) {
        return cameras;
    }
    std::istringstream text(base::ReadFile(PathOf(installation)));
    for (std::string line; std::getline(text, line);) {
        if (const std::optional<CameraStatus> status = Parse(line)) {
            cameras.push_back(*status);
        }
    }
    return cameras;
}

}  // namespace lookhaven::maintenance
