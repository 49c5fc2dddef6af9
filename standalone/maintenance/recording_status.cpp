// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/recording_status.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <sstream>
#include <utility>

#include "standalone/base/file.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::array<std::pair<RecordingState, const char*>, 7> kNames{{
    {RecordingState::kReady, "ready"},
    {RecordingState::kRecording, "recording"},
    {RecordingState::kDiskFull, "disk-full"},
    {RecordingState::kDiskFails, "disk-fails"},
    {RecordingState::kMountGone, "mount-gone"},
    {RecordingState::kNoMount, "no-mount"},
    {RecordingState::kNoEventId, "no-number"},
}};

std::filesystem::path PathOf(const base::Installation& installation) {
    return installation.RunFolder() / "recordings";
}

}  // namespace

const char* NameOf(RecordingState state) {
    return std::ranges::find(kNames, state, &std::pair<RecordingState, const char*>::first)->second;
}

void WriteRecordingStatus(const base::Installation& installation, const std::vector<RecordingStatus>& cameras) {
    std::ostringstream text;
    for (const RecordingStatus& each : cameras) {
        std::string name = each.camera_name;
        std::ranges::replace(name, '\n', ' ');
        text << each.camera << ' ' << NameOf(each.state) << ' ' << each.event << ' ' << each.dropped_frames << ' '
             << name << '\n';
    }
    base::WriteFileAtomically(PathOf(installation), text.str());
}

std::vector<RecordingStatus> ReadRecordingStatus(const base::Installation& installation) {
    std::vector<RecordingStatus> cameras;
    std::error_code ignored;
    if (!std::filesystem::exists(PathOf(installation), ignored)) {
        return cameras;
    }
    std::istringstream text(base::ReadFile(PathOf(installation)));
    for (std::string line; std::getline(text, line);) {
        std::istringstream fields(line);
        RecordingStatus each;
        std::string state;
        if (!(fields >> each.camera >> state >> each.event >> each.dropped_frames)) {
            continue;
        }
        std::getline(fields >> std::ws, each.camera_name);
        for (const auto& [value, name] : kNames) {
            if (state == name) {
                each.state = value;
                cameras.push_back(each);
            }
        }
    }
    return cameras;
}

}  // namespace lookhaven::maintenance
