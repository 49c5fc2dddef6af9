// SPDX-License-Identifier: Apache-2.0
#include "standalone/demo/events.h"

#include <algorithm>
#include <random>
#include <vector>

#include "standalone/archive/layout.h"
#include "standalone/demo/outcome.h"
#include "standalone/media/packet.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"

namespace lookhaven::demo {

namespace {

using store::Event;
using store::Mark;

constexpr std::int64_t kDaySeconds = 86400;
constexpr std::size_t kRowsPerTransaction = 20'000;
constexpr int kEventsPerMark = 50;

class EventGenerator {
  public:
    // slot_s: the time that each event of a camera has to itself, at least 1.
    EventGenerator(int mount_id, double slot_s) : mount_id_(mount_id), slot_s_(slot_s) {}

    Event MakeEvent(const store::Camera& camera, std::int64_t slot_start_s, int number) {
        const std::int64_t max_length = std::clamp<std::int64_t>(static_cast<std::int64_t>(slot_s_), 1, 600);
        Event event;
        event.camera_id = camera.id;
        event.mount_id = mount_id_;
        const std::int64_t length = Draw(std::max<std::int64_t>(max_length / 4, 1), max_length);
        event.start_s = slot_start_s + Draw(0, std::max<std::int64_t>(static_cast<std::int64_t>(slot_s_) - length, 0));
        event.end_s = event.start_s + length;
        event.reason = Draw(0, 9) == 0 ? base::kReasonAlarm : base::kReasonContinuous;
        event.frame_count = static_cast<int>(length * 25);
        event.video_type = camera.video_type;
        event.audio_codec = camera.audio ? base::CodecName(base::Codec::kAac) : "";
        const store::CameraProfile* profile = camera.FindProfile(camera.live_profile);
        event.width = profile != nullptr && profile->width > 0 ? profile->width : 1280;
        event.height = profile != nullptr && profile->height > 0 ? profile->height : 720;
        event.size_bytes = length * Draw(150'000, 400'000) * (event.video_type == base::Codec::kMjpeg ? 8 : 1);
        event.path = archive::PathOf({camera.id, event.start_s, number, archive::FileKind::kRecording});
        event.demo = true;
        return event;
    }

    Mark MakeMark(const Event& event) {
        Mark mark;
        mark.kind = Draw(0, 1) == 0 ? store::MarkKind::kAlert : store::MarkKind::kPos;
        mark.camera_id = event.camera_id;
        mark.moment_s = Draw(event.start_s, event.end_s);
        mark.start_s = std::max<std::int64_t>(mark.moment_s - 5, 0);
        mark.end_s = mark.moment_s + 10;
        mark.text = mark.kind == store::MarkKind::kAlert ? "Somebody at the door" : "2 x Coffee 6.40\nTotal 12.80";
        mark.state = store::MarkState::kMissed;
        mark.demo = true;
        return mark;
    }

  private:
    std::int64_t Draw(std::int64_t first, std::int64_t last) {
        return std::uniform_int_distribution<std::int64_t>(first, last)(random_);
    }

    int mount_id_;
    double slot_s_;
    std::mt19937_64 random_{1};
};

}  // namespace

EventCounts GenerateEvents(store::Store& store, int count, int days, std::int64_t now_s) {
    const std::vector<store::Camera> cameras = store::Cameras(store).List();
    const auto mount = store::Mounts(store).FindForPlan(0);
    if (cameras.empty() || !mount) {
        throw NotReady("events need a camera and a mount: run lookhaven demo setup");
    }
    const auto camera_count = static_cast<int>(cameras.size());
    const int per_camera = (count + camera_count - 1) / camera_count;
    const double span_s = static_cast<double>(days) * kDaySeconds;
    const double slot_s = span_s / per_camera;
    if (slot_s < 1 || now_s < days * kDaySeconds) {
        throw std::invalid_argument("that many events do not fit into that many days, or the days begin before 1970");
    }
    EventGenerator generator(mount->id, slot_s);
    store::Events events(store);
    store::Marks marks(store);
    std::vector<Event> new_events;
    std::vector<Mark> new_marks;
    EventCounts counts;
    const auto flush = [&] {
        events.AddAll(new_events);
        marks.AddAll(new_marks);
        counts.events += static_cast<int>(new_events.size());
        counts.marks += static_cast<int>(new_marks.size());
        new_events.clear();
        new_marks.clear();
    };
    for (int i = 0; i < count; ++i) {
        const int slot = i / camera_count;
        const auto offset_s = static_cast<std::int64_t>(slot * slot_s - span_s);
        const store::Camera& camera = cameras[static_cast<std::size_t>(i % camera_count)];
        new_events.push_back(generator.MakeEvent(camera, now_s + offset_s, i + 1));
        if (i % kEventsPerMark == kEventsPerMark - 1) {
            new_marks.push_back(generator.MakeMark(new_events.back()));
        }
        if (new_events.size() == kRowsPerTransaction) {
            flush();
        }
    }
    flush();
    return counts;
}

}  // namespace lookhaven::demo
