// SPDX-License-Identifier: Apache-2.0
//
// Stands in for the recorder of a host, without footage: holds the leases of its cameras and stores their rows, as the
// recorder does and by its own code, until it gets SIGTERM. Prints how many events it began and saw stored.
//
// Arguments: the first camera's id, how many there are, the seconds of an event, those between two marks of a camera.
// The installation is the one of LOOKHAVEN_HOME, which is a host with a mount; the cameras are fixed to it.
#include <algorithm>
#include <chrono>
#include <csignal>
#include <iostream>
#include <map>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "standalone/archive/layout.h"
#include "standalone/base/clock.h"
#include "standalone/base/installation.h"
#include "standalone/recorder/camera_lease_keeper.h"
#include "standalone/recorder/catalog.h"
#include "standalone/recorder/event_row_queue.h"
#include "standalone/recorder/partition_maintenance.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recorder_lease.h"

namespace {

using namespace lookhaven;

constexpr std::int64_t kOfflineUs = 30'000'000;
constexpr std::int64_t kBytesPerSecond = 500'000;
constexpr int kFramesPerSecond = 25;

volatile std::sig_atomic_t g_stop = 0;

struct Camera {
    int id = 0;
    int phase_s = 0;  // so that not all events begin at once
    std::optional<store::Event> event = std::nullopt;
};

class Recorder {
  public:
    Recorder(const base::Installation& installation, int first, int count, int event_s, int mark_s)
        : partitions_(installation.StoreUrl()),
          rows_(installation.StoreUrl(), store::RecorderName(installation), installation.HostId()),
          camera_leases_(installation, rows_, kOfflineUs),
          catalog_(installation.StoreUrl(), installation.HostId(), [] {}),
          store_(store::Store::Open(installation.StoreUrl())),
          event_s_(event_s),
          mark_s_(mark_s) {
        for (const store::Mount& mount : store::Mounts(store_).List()) {
            mount_ = mount.host_id == installation.HostId() ? mount.id : mount_;
        }
        for (int i = 0; i < count; ++i) {
            cameras_.push_back({.id = first + i, .phase_s = i * event_s / count});
        }
    }

    // What a second brings.
    void Step(std::int64_t now_s) {
        const std::set<int> held = camera_leases_.Held();
        std::set<int> recorded;
        std::map<int, std::uint64_t> received;
        for (Camera& camera : cameras_) {
            if (held.contains(camera.id)) {
                Record(camera, now_s);
                recorded.insert(camera.id);
                received[camera.id] = static_cast<std::uint64_t>(now_s * kBytesPerSecond);
            }
        }
        partitions_.Ask();
        rows_.Refresh(cameras_.size());
        camera_leases_.NoteRecorded(std::move(recorded));
        camera_leases_.Ask(store::HostRoom::kFree, received);
        catalog_.Refresh();
    }

    int Begun() const { return begun_; }
    std::int64_t Unstored() const {
        return std::ranges::count_if(cameras_, [&](const Camera& camera) { return rows_.HasUnstored(camera.id); });
    }

    void Stop() {
        camera_leases_.RequestStop();
        catalog_.RequestStop();
        rows_.RequestStop();
    }

  private:
    void Record(Camera& camera, std::int64_t now_s) {
        const std::int64_t place_s = now_s + camera.phase_s;
        if (camera.event && place_s % event_s_ == 0) {
            camera.event->recording = false;
            rows_.Put(*camera.event);
            camera.event.reset();
        }
        if (!camera.event) {
            if (const std::optional<int> id = rows_.TakeId()) {
                camera.event = Begin(camera.id, *id, now_s);
            }
        }
        if (camera.event) {
            camera.event->end_s = std::max(now_s, camera.event->start_s) + 1;
            camera.event->frame_count += kFramesPerSecond;
            camera.event->size_bytes += kBytesPerSecond;
            rows_.Put(*camera.event);
        }
        if (mark_s_ > 0 && place_s % mark_s_ == 0) {
            store::Marks marks(store_);
            const store::Mark mark =
                marks.Add(store::MarkKind::kAlert, camera.id, now_s, 0, "Somebody at the door", {}, now_s);
            marks.Save(mark.id, mount_, archive::PathOf({camera.id, now_s, mark.id, archive::FileKind::kSpan}));
        }
    }

    store::Event Begin(int camera, int id, std::int64_t now_s) {
        ++begun_;
        return {.id = id,
                .camera_id = camera,
                .mount_id = mount_,
                .start_s = now_s,
                .recording = true,
                .video_type = base::Codec::kH264,
                .audio_codec = "AAC",
                .width = 1280,
                .height = 720,
                .path = archive::PathOf({camera, now_s, id, archive::FileKind::kRecording})};
    }

    recorder::PartitionMaintenance partitions_;
    recorder::EventRowQueue rows_;
    recorder::CameraLeaseKeeper camera_leases_;
    recorder::Catalog catalog_;
    store::Store store_;
    const int event_s_;
    const int mark_s_;
    int mount_ = 0;
    int begun_ = 0;
    std::vector<Camera> cameras_;
};

int Run(int first, int count, int event_s, int mark_s) {
    const auto installation = base::Installation::FromEnvironment();
    Recorder recorder(installation, first, count, event_s, mark_s);
    auto next = std::chrono::steady_clock::now();
    while (g_stop == 0) {
        recorder.Step(base::WallSeconds());
        next += std::chrono::seconds(1);
        std::this_thread::sleep_until(next);
    }
    recorder.Stop();
    std::cout << recorder.Begun() << ' ' << recorder.Unstored() << '\n';
    return 0;
}

}  // namespace

int main(int count, char** arguments) {
    if (count != 5) {
        std::cerr << "bench_rows: arguments are first camera, cameras, seconds of an event, seconds between marks\n";
        return 64;
    }
    std::signal(SIGTERM, [](int) { g_stop = 1; });
    return Run(std::stoi(arguments[1]), std::stoi(arguments[2]), std::stoi(arguments[3]), std::stoi(arguments[4]));
}
