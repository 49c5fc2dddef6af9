// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/camera_options.h"

#include <algorithm>

#include "standalone/base/codec_words.h"
#include "standalone/cli/units.h"
#include "standalone/pattern/pattern_source.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

namespace {

using store::Camera;
using store::CameraProfile;

// "640x360"
void ParsePictureSize(const std::string& text, CameraProfile& profile) {
    const std::size_t x = text.find('x');
    const auto width = ParseNumber<int>(text.substr(0, x));
    const auto height = ParseNumber<int>(x == text.npos ? "" : text.substr(x + 1));
    if (!width || !height) {
        throw Failure(kUsage, "a size looks like 1280x720");
    }
    profile.width = *width;
    profile.height = *height;
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

}  // namespace

void CameraOptions::AddTo(Command& command) {
    command.Option("--name", name_, "The camera's name")
        .Option("--type", type_, "The video codec (default: probed)", OneOf(base::VideoCodecWords()))
        .Option("--live", live_profile_, "The profile shown in the live view (initially high)",
                OneOf(store::ProfileNames()))
        .Switch("--enable,!--disable", enabled_, "Whether it is shown and recorded")
        .Switch("--ptz,!--no-ptz", ptz_, "Whether it can pan, tilt and zoom")
        .Switch("--audio,!--no-audio", audio_, "Whether it sends audio")
        .Switch("--insecure,!--secure", insecure_,
                "Whether to accept any HTTPS certificate (initially only one that this machine trusts)")
        .Option("--max-age", max_age_,
                "Age up to which its recordings are kept, such as 3d; 0 for no limit but the mount's");
    for (const auto& [name, number] : store::ProfileNames()) {
        ProfileOptions& profile = profiles_[static_cast<std::size_t>(number)];
        const std::string prefix = number == 0 ? "--" : "--" + name + "-";
        const std::string of = " of the profile " + name;
        command
            .Option(prefix + "source", profile.source,
                    "Address" + of + ": " + media::ListKinds(pattern::AllSourceKinds()) +
                        (number == 0 ? "" : "; empty removes the profile"))
            .Option(prefix + "size", profile.size, "Picture size" + of + ", such as 1280x720")
            .Option(prefix + "fps", profile.fps, "Frames per second" + of);
    }
}

void CameraOptions::ApplyTo(Camera& camera) const {
    AssignIfGiven(camera.name, name_);
    AssignIfGiven(camera.video_type, type_);
    AssignIfGiven(camera.live_profile, live_profile_);
    AssignIfGiven(camera.enabled, enabled_);
    AssignIfGiven(camera.ptz, ptz_);
    AssignIfGiven(camera.audio, audio_);
    AssignIfGiven(camera.insecure, insecure_);
    if (max_age_) {
        camera.max_age_s = ParseDuration(*max_age_);
    }
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
            ParsePictureSize(*given.size, profile);
        }
    }
}

std::string VideoTypeText(const Json::Value& type) {
    return base::CodecTitle(static_cast<base::Codec>(type.asInt()));
}

}  // namespace lookhaven::cli
