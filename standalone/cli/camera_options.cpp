// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/camera_options.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <map>

#include "standalone/cli/commands.h"
#include "standalone/pattern/pattern_source.h"

namespace lookhaven::cli {

namespace {

using store::Camera;
using store::CameraProfile;

const std::map<std::string, base::Codec> kTypes = {
    {"mjpeg", base::Codec::kMjpeg}, {"h264", base::Codec::kH264}, {"h265", base::Codec::kH265}};
const std::map<std::string, int> kProfiles = {{"high", 0}, {"low", 1}, {"mobile", 2}};

// "640x360"
void ParseSize(const std::string& text, CameraProfile& profile) {
    const char* end = text.data() + text.size();
    const auto [after_width, width_error] = std::from_chars(text.data(), end, profile.width);
    if (width_error == std::errc() && after_width != end && *after_width == 'x') {
        const auto [after_height, height_error] = std::from_chars(after_width + 1, end, profile.height);
        if (height_error == std::errc() && after_height == end) {
            return;
        }
    }
    throw Failure(kUsage, "a size looks like 1280x720");
}

CameraProfile& ProfileOf(Camera& camera, int number) {
    auto place = std::lower_bound(camera.profiles.begin(), camera.profiles.end(), number,
                                  [](const CameraProfile& profile, int wanted) { return profile.number < wanted; });
    if (place == camera.profiles.end() || place->number != number) {
        place = camera.profiles.insert(place, CameraProfile{number, "", 0, 0, 0});
    }
    return *place;
}

template <typename T>
void AssignIfGiven(T& target, const std::optional<T>& given) {
    target = given.value_or(target);
}

// A flag and its opposite. Bound to the optional itself, the library would fill it with false when neither is given.
void AddSwitch(CLI::App& command, const char* names, std::optional<bool>& value, const char* meaning) {
    command.add_flag_function(
        names, [&value](std::int64_t count) { value = count > 0; }, meaning);
}

}  // namespace

void CameraOptions::AddTo(CLI::App& command) {
    command.add_option("--name", name_, "What the camera is called");
    Choose(command.add_option("--type", type_, "How the video is coded (else found out)"), kTypes);
    Choose(command.add_option("--live", live_profile_, "The profile that the live view shows (high at first)"),
           kProfiles);
    AddSwitch(command, "--enable,!--disable", enabled_, "Whether it is shown and recorded");
    AddSwitch(command, "--ptz,!--no-ptz", ptz_, "Whether it moves");
    AddSwitch(command, "--audio,!--no-audio", audio_, "Whether it hears");
    for (const auto& [name, number] : kProfiles) {
        ProfileOptions& profile = profiles_[static_cast<std::size_t>(number)];
        const std::string prefix = number == 0 ? "--" : "--" + name + "-";
        const std::string of = " of the profile " + name;
        command.add_option(prefix + "source", profile.source,
                           "Address" + of + ": " + media::ListKinds(pattern::AllSourceKinds()) +
                               (number == 0 ? "" : "; empty takes the profile away"));
        command.add_option(prefix + "size", profile.size, "Picture size" + of + ", such as 1280x720");
        command.add_option(prefix + "fps", profile.fps, "Frames per second" + of);
    }
}

void CameraOptions::ApplyTo(Camera& camera) const {
    AssignIfGiven(camera.name, name_);
    AssignIfGiven(camera.video_type, type_);
    AssignIfGiven(camera.live_profile, live_profile_);
    AssignIfGiven(camera.enabled, enabled_);
    AssignIfGiven(camera.ptz, ptz_);
    AssignIfGiven(camera.audio, audio_);
    for (int number = 0; number < store::kProfileCount; ++number) {
        const ProfileOptions& given = profiles_[static_cast<std::size_t>(number)];
        if (given.source && given.source->empty()) {
            std::erase_if(camera.profiles, [number](const CameraProfile& profile) { return profile.number == number; });
            continue;
        }
        if (!given.source && !given.size && !given.fps) {
            continue;
        }
        if (!given.source && camera.FindProfile(number) == nullptr) {
            throw Failure(kUsage, "a profile needs a source before it has a size or a rate");
        }
        CameraProfile& profile = ProfileOf(camera, number);
        AssignIfGiven(profile.source, given.source);
        AssignIfGiven(profile.fps, given.fps);
        if (given.size) {
            ParseSize(*given.size, profile);
        }
    }
}

const std::map<std::string, int>& ProfileNames() {
    return kProfiles;
}

const char* VideoTypeName(base::Codec type) {
    return type == base::Codec::kMjpeg ? "MJPEG" : type == base::Codec::kH264 ? "H.264" : "H.265";
}

}  // namespace lookhaven::cli
