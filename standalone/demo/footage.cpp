// SPDX-License-Identifier: Apache-2.0
#include "standalone/demo/footage.h"

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"
#include "standalone/archive/repair.h"
#include "standalone/demo/outcome.h"
#include "standalone/maintenance/marks.h"
#include "standalone/maintenance/mount_folder.h"
#include "standalone/maintenance/recording_recovery.h"
#include "standalone/media/recording_writer.h"
#include "standalone/pattern/pattern_audio.h"
#include "standalone/pattern/pattern_encoder.h"
#include "standalone/pattern/scene.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"

namespace lookhaven::demo {

namespace {

constexpr std::int64_t kHour = 3600;
constexpr std::int64_t kSceneAgesS[] = {71 * kHour, 46 * kHour, 25 * kHour, 3 * kHour};
constexpr int kSceneSeconds = 20;
constexpr int kMarkOffsetS = 6;  // the footage of a mark lies within the scene
const pattern::PatternSettings kSettings = {.width = 640, .height = 360, .fps = 25, .gop = 25, .quality = 80};

class SceneRecorder {
  public:
    explicit SceneRecorder(const store::Camera& camera)
        : scene_(kSettings.width, kSettings.height, camera.name),
          encoder_(
              pattern::MakePatternEncoder(camera.video_type == base::Codec::kMjpeg ? "mjpeg" : "h264", kSettings)) {
        if (camera.audio) {
            chime_.emplace();
        }
    }

    void Record(const std::filesystem::path& file, std::int64_t start_s) {
        std::optional<media::RecordingWriter> writer;
        std::int64_t block = 0;
        for (int i = 0; i < kSceneSeconds * kSettings.fps; ++i) {
            const std::int64_t time_us = i * std::int64_t{1'000'000} / kSettings.fps;
            const pattern::Picture& picture = scene_.Draw(i, start_s * 1000 + time_us / 1000);
            // Frame numbers continue from scene to scene, since the encoder places key frames by them.
            const pattern::EncodedPicture encoded = encoder_->Encode(picture, number_++);
            if (!writer) {
                writer.emplace(file, media::MediaFormat{encoder_->Format(), AudioFormat()}, start_s * 1000,
                               base::kReasonContinuous);
            }
            writer->Write({base::Medium::kVideo, encoded.data, time_us, encoded.key_frame, &encoder_->Format()});
            for (; chime_ && chime_->BlockTime(block) <= time_us; ++block) {
                writer->Write(
                    {base::Medium::kAudio, chime_->Block(block), chime_->BlockTime(block), true, &chime_->Format()});
            }
        }
        writer->Close();
    }

  private:
    std::optional<media::StreamFormat> AudioFormat() const {
        return chime_ ? std::optional(chime_->Format()) : std::nullopt;
    }

    pattern::Scene scene_;
    std::unique_ptr<pattern::PatternEncoder> encoder_;
    std::optional<pattern::Chime> chime_;
    std::int64_t number_ = 0;
};

bool IsRecordedPattern(const store::Camera& camera, const store::RecordingPlan& plan) {
    const store::CameraProfile* live = camera.FindProfile(camera.live_profile);
    return live != nullptr && live->source.starts_with("test:") && camera.video_type != base::Codec::kH265 &&
           plan.mode == store::RecordMode::kAlways;
}

bool HasEvents(store::Events& events, int camera) {
    store::EventFilter filter;
    filter.camera_ids = {camera};
    filter.limit = 1;
    return !events.List(filter).empty();
}

void AddMark(store::Store& store, int camera, std::int64_t moment_s, bool is_transaction) {
    store::Marks marks(store);
    const store::Mark mark =
        is_transaction
            ? marks.Add(store::MarkKind::kPos, camera, moment_s, 2, "2 x Coffee  6.40\n1 x Cake  4.10\nTotal  10.50")
            : marks.Add(store::MarkKind::kAlert, camera, moment_s, 2, "Somebody at the door");
    maintenance::SaveMark(store, mark);
}

}  // namespace

EventCounts RecordFootage(store::Store& store, std::int64_t now_s) {
    const std::optional<store::Mount> mount = store::Mounts(store).FindForPlan(0);
    if (!mount || !maintenance::OpenMount(store, *mount)) {
        throw NotReady("there is no mount to record to: run lookhaven init");
    }
    store::Events events(store);
    EventCounts counts;
    for (const store::Camera& camera : store::Cameras(store).List()) {
        if (!IsRecordedPattern(camera, store::RecordingPlans(store).Find(camera.id)) || HasEvents(events, camera.id)) {
            continue;
        }
        SceneRecorder recorder(camera);
        for (const std::int64_t age_s : kSceneAgesS) {
            const std::int64_t start_s = now_s - age_s - counts.events * 600;
            const archive::FileName name{camera.id, start_s, events.NextId(), archive::FileKind::kRecording};
            archive::MakeFolderFor(mount->path, name);
            const std::filesystem::path file = std::filesystem::path(mount->path) / archive::PathOf(name);
            recorder.Record(file, start_s);
            archive::WriteRecordingLog(std::filesystem::path(mount->path) / std::to_string(camera.id), start_s,
                                       start_s + kSceneSeconds, base::kReasonContinuous);
            events.Begin(maintenance::RowOf(name, mount->id, archive::CloseCrashed(file)));
            AddMark(store, camera.id, start_s + kMarkOffsetS, counts.marks % 2 == 1);
            ++counts.events;
            ++counts.marks;
        }
    }
    return counts;
}

}  // namespace lookhaven::demo
