// SPDX-License-Identifier: Apache-2.0
//
// The options that describe a camera, and how they change a record.
#pragma once

#include <array>
#include <optional>
#include <string>

#include "standalone/cli/command_group.h"
#include "standalone/store/cameras.h"

namespace lookhaven::cli {

// What was given on the command line; what was not stays as it is.
class CameraOptions {
  public:
    // This object must outlive the command.
    void AddTo(Command& command);

    // Throws Failure when a profile that has no source was given a size or rate, and for an age of another form.
    void ApplyTo(store::Camera& camera) const;

    bool HasType() const { return type_.has_value(); }
    bool HasAudio() const { return audio_.has_value(); }
    // Whether a source was given for the profile of that number, even the one that it had before.
    bool HasSource(int profile) const { return profiles_[static_cast<std::size_t>(profile)].source.has_value(); }

  private:
    struct ProfileOptions {
        std::optional<std::string> source;
        std::optional<std::string> size;
        std::optional<int> fps;
    };

    std::optional<std::string> name_;
    std::optional<base::Codec> type_;
    std::optional<int> live_profile_;
    std::optional<bool> enabled_;
    std::optional<bool> ptz_;
    std::optional<bool> audio_;
    std::optional<bool> insecure_;
    std::optional<std::string> max_age_;
    std::array<ProfileOptions, store::kProfileCount> profiles_;
};

// base::CodecTitle for a member "video_type".
std::string VideoTypeText(const Json::Value& type);

}  // namespace lookhaven::cli
