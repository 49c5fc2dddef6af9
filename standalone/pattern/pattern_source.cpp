// SPDX-License-Identifier: Apache-2.0
//
// Frames are drawn and encoded when they are due.
#include "standalone/pattern/pattern_source.h"

#include <algorithm>
#include <charconv>
#include <map>

#include "standalone/base/clock.h"
#include "standalone/base/text.h"
#include "standalone/camera/isolated_source.h"
#include "standalone/media/pace.h"
#include "standalone/pattern/pattern_audio.h"
#include "standalone/pattern/pattern_encoder.h"
#include "standalone/pattern/scene.h"

namespace lookhaven::pattern {

namespace {

// "mjpeg?size=640x360&label=Front%20door" as its name and its parameters, decoded.
struct PatternUrl {
    std::string name;
    std::map<std::string, std::string> parameters;
};

PatternUrl ParsePatternUrl(std::string_view text) {
    PatternUrl url;
    url.name = text.substr(0, text.find('?'));
    text.remove_prefix(std::min(url.name.size() + 1, text.size()));
    while (!text.empty()) {
        const std::string_view pair = text.substr(0, text.find('&'));
        text.remove_prefix(std::min(pair.size() + 1, text.size()));
        const std::size_t equals = std::min(pair.find('='), pair.size());
        url.parameters[std::string(pair.substr(0, equals))] =
            *base::DecodeForm(pair.substr(std::min(equals + 1, pair.size())), base::BrokenEscape::kKeep);
    }
    return url;
}

int Number(const PatternUrl& url, const char* key, int fallback, int min, int max) {
    const auto found = url.parameters.find(key);
    if (found == url.parameters.end()) {
        return fallback;
    }
    const std::string& text = found->second;
    int value = 0;
    const auto end = text.data() + text.size();
    if (std::from_chars(text.data(), end, value).ptr != end || value < min || value > max) {
        throw media::SourceError(std::string("has a ") + key + " that is not from " + std::to_string(min) + " to " +
                                 std::to_string(max));
    }
    return value;
}

PatternSettings SettingsOf(const PatternUrl& url) {
    PatternSettings settings;
    if (const auto size = url.parameters.find("size"); size != url.parameters.end()) {
        const std::string& text = size->second;
        const char* end = text.data() + text.size();
        const auto width = std::from_chars(text.data(), end, settings.width);
        if (width.ptr == end || *width.ptr != 'x' || std::from_chars(width.ptr + 1, end, settings.height).ptr != end) {
            throw media::SourceError("has a size that is not written like 1280x720");
        }
    }
    const bool fits =
        settings.width >= 160 && settings.width <= 3840 && settings.height >= 120 && settings.height <= 2160;
    if (!fits || settings.width % 2 != 0 || settings.height % 2 != 0) {
        throw media::SourceError("has a size that is odd or not from 160x120 to 3840x2160");
    }
    settings.fps = Number(url, "fps", settings.fps, 1, 60);
    settings.gop = Number(url, "gop", settings.fps, 1, 600);
    settings.quality = Number(url, "quality", settings.quality, 1, 100);
    return settings;
}

class PatternSource : public media::Source {
  public:
    PatternSource(const PatternUrl& url, std::stop_token stop)
        : stop_(std::move(stop)),
          settings_(SettingsOf(url)),
          scene_(settings_.width, settings_.height, Label(url)),
          encoder_(MakePatternEncoder(url.name, settings_)) {
        if (const auto audio = url.parameters.find("audio"); audio != url.parameters.end()) {
            if (audio->second != "aac") {
                throw media::SourceError("has a sound other than aac");
            }
            chime_.emplace();
            audio_ = chime_->Format();
        }
        start_us_ = base::MonotonicMicros();
    }

    const std::optional<media::StreamFormat>& Audio() const override { return audio_; }

    media::Packet Next() override {
        const std::int64_t picture_us = start_us_ + frame_number_ * 1'000'000 / settings_.fps;
        if (audio_ && start_us_ + chime_->BlockTime(block_number_) < picture_us) {
            return NextBlock();
        }
        Wait(picture_us);
        const Picture& picture = scene_.Draw(frame_number_, base::WallMillis());
        const EncodedPicture encoded = encoder_->Encode(picture, frame_number_);
        ++frame_number_;
        return {base::Medium::kVideo, encoded.data, picture_us, encoded.key_frame, &encoder_->Format()};
    }

  private:
    static std::string Label(const PatternUrl& url) {
        const auto label = url.parameters.find("label");
        return label == url.parameters.end() ? "Test" : label->second.substr(0, 24);
    }

    media::Packet NextBlock() {
        const std::int64_t block_us = start_us_ + chime_->BlockTime(block_number_);
        Wait(block_us);
        return {base::Medium::kAudio, chime_->Block(block_number_++), block_us, true, &*audio_};
    }

    // After the machine slept or was too busy, continue from now: nobody needs the missed frames. Both media shift
    // together.
    void Wait(std::int64_t due_us) {
        if (!media::SleepUntil(due_us, stop_)) {
            throw media::SourceError("stopped");
        }
        const std::int64_t late_us = base::MonotonicMicros() - due_us;
        start_us_ += late_us > 500'000 ? late_us : 0;
    }

    std::stop_token stop_;
    PatternSettings settings_;
    Scene scene_;
    std::unique_ptr<PatternEncoder> encoder_;
    std::optional<Chime> chime_;
    std::optional<media::StreamFormat> audio_;
    std::int64_t start_us_ = 0;
    std::int64_t frame_number_ = 0;
    std::int64_t block_number_ = 0;
};

}  // namespace

std::unique_ptr<media::Source> OpenPattern(const std::string& url, const media::SourceOptions&, std::stop_token stop) {
    return std::make_unique<PatternSource>(
        ParsePatternUrl(std::string_view(url).substr(std::string_view("test:").size())), std::move(stop));
}

media::SourceKinds AllSourceKinds() {
    media::SourceKinds kinds = camera::IsolatedKinds();
    kinds.emplace("test:", OpenPattern);
    return kinds;
}

}  // namespace lookhaven::pattern
