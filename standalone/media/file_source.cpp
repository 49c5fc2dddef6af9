// SPDX-License-Identifier: Apache-2.0
//
// A video file, played in a loop at its own pace.
#include <filesystem>

#include "standalone/base/clock.h"
#include "standalone/media/demuxer.h"
#include "standalone/media/pace.h"
#include "standalone/media/source_kinds.h"

namespace lookhaven::media {

namespace {

constexpr std::int64_t kGapBetweenRoundsUs = 40'000;

class FileLoop : public Source {
  public:
    FileLoop(std::string path, const SourceOptions& options, std::stop_token stop)
        : path_(std::move(path)),
          deadline_(std::move(stop), options.no_data_limit) {
        // A pipe or a device could block forever, and would not play twice.
        if (!std::filesystem::is_regular_file(path_)) {
            throw SourceError("is not a regular file");
        }
        Open();
    }

    const std::optional<StreamFormat>& Audio() const override { return demuxer_->Audio(); }

    Packet Next() override {
        std::optional<Packet> packet = demuxer_->Read();
        if (!packet) {
            Open();
            offset_us_.reset();
            packet = demuxer_->Read();
        }
        if (!packet) {
            throw SourceError("holds no whole frame");
        }
        if (!offset_us_) {
            // Each round begins one frame's duration after the last, or now when that has passed.
            offset_us_ = std::max(base::MonotonicMicros(), last_us_ + kGapBetweenRoundsUs) - packet->timestamp_us;
        }
        packet->timestamp_us += *offset_us_;
        last_us_ = std::max(last_us_, packet->timestamp_us);
        SleepUntil(packet->timestamp_us, deadline_.Stop());
        deadline_.Rearm();  // a pause in the recording is no stall
        deadline_.Check();
        return *packet;
    }

  private:
    // Only containers that hold their media themselves: a playlist could name any file of the machine.
    void Open() {
        AvOptions options;
        options.Set("protocol_whitelist", "file")
            .Set("format_whitelist", "matroska,mov,avi,mpegts,h264,hevc,mjpeg,flv");
        demuxer_.emplace("file:" + path_, options, deadline_, Demuxer::Framing::kWhole);
    }

    std::string path_;
    Deadline deadline_;
    std::optional<Demuxer> demuxer_;
    std::optional<std::int64_t> offset_us_;
    std::int64_t last_us_ = 0;
};

}  // namespace

std::unique_ptr<Source> OpenFileLoop(const std::string& url, const SourceOptions& options, std::stop_token stop) {
    const std::string rest = url.substr(std::string_view("file:").size());
    std::string path = rest.starts_with("///") ? rest.substr(2) : rest;
    return std::make_unique<FileLoop>(path, options, std::move(stop));
}

}  // namespace lookhaven::media
