// SPDX-License-Identifier: Apache-2.0
#include "test/support/footage/footage.h"

#include <array>
#include <fstream>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"
#include "standalone/archive/span_file.h"
#include "standalone/store/hosts.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"

namespace lookhaven::test {

WrittenRecording::WrittenRecording(const std::filesystem::path& path, std::int64_t start_wall_ms, int period_ms)
    : path_(path),
      index_(archive::IndexPathOf(path), {"MJPEG", "", 640, 480, start_wall_ms, base::kReasonContinuous}),
      period_ms_(period_ms) {
    std::ofstream(path_) << "head";
}

void WrittenRecording::Append(int frames) {
    for (int i = 0; i < frames; ++i, ++frames_) {
        const std::string picture = "picture " + std::to_string(frames_);
        const auto offset = std::filesystem::file_size(path_);
        std::ofstream(path_, std::ios::app) << picture;
        const std::array<archive::FrameEntry, 1> entry{{{offset, static_cast<std::uint32_t>(picture.size()),
                                                         static_cast<std::uint32_t>(frames_ * period_ms_), true}}};
        index_.Append(entry);
    }
}

Footage::Footage(const std::string& store_url, const std::filesystem::path& folder)
    : records_(store::Store::Open(store_url)),
      mount_(folder / "mount") {
    std::filesystem::create_directories(mount_);
    store::Mount mount;
    mount.name = "Disk";
    mount.path = mount_.string();
    mount_id_ = store::Mounts(records_).Add(mount);
    for (const char* name : {"Entrance", "Straße", "Yard"}) {
        store::Camera camera;
        camera.name = name;
        camera.profiles = {{0, "test:mjpeg", 0, 0, 0}};
        store::Cameras(records_).Add(camera);
    }
}

int Footage::Record(int camera, std::int64_t start_s, int seconds) {
    store::Event event;
    event.id = store::Events(records_).NextId();
    event.camera_id = camera;
    event.mount_id = mount_id_;
    event.start_s = start_s;
    event.end_s = start_s + seconds;
    event.frame_count = seconds * 10;
    event.size_bytes = 1'572'864;
    event.width = 640;
    event.height = 480;
    const archive::FileName name{camera, start_s, event.id, archive::FileKind::kRecording};
    event.path = archive::PathOf(name);
    archive::MakeFolderFor(mount_, name);
    WrittenRecording file(mount_ / event.path, start_s * 1000, 100);
    file.Append(event.frame_count);
    file.Finish();
    archive::WriteRecordingLog(mount_ / std::to_string(camera), start_s, event.end_s, base::kReasonContinuous);
    store::Events(records_).Begin(event);
    store::Events(records_).Finish(event.id, event.end_s, event.frame_count, event.size_bytes);
    return event.id;
}

int Footage::Mark(int kind, int camera, std::int64_t start_s, int seconds, const std::string& text, int event) {
    store::Marks marks(records_);
    const int id = marks.Add(static_cast<store::MarkKind>(kind), camera, start_s, seconds, text).id;
    const archive::FileName name{camera, start_s, id, archive::FileKind::kSpan};
    const auto recording = std::filesystem::path(store::Events(records_).Find(event).value().path);
    archive::WriteSpan(
        mount_ / archive::PathOf(name),
        {start_s * 1000, (start_s + seconds) * 1000, {recording.parent_path().filename() / recording.filename()}});
    marks.Save(id, mount_id_, archive::PathOf(name));
    return id;
}

std::filesystem::path Footage::FileOf(int event) {
    return mount_ / store::Events(records_).Find(event).value().path;
}

void Footage::ShareMount(int hosts) {
    for (int number = 1; number <= hosts; ++number) {
        store::Hosts(records_).Add({.name = "nvr" + std::to_string(number),
                                    .address = "nvr.example",
                                    .port = 8443,
                                    .certificate = "-----BEGIN CERTIFICATE-----\nMII=\n-----END CERTIFICATE-----\n"});
    }
    store::Mounts mounts(records_);
    store::Mount mount = mounts.Find(mount_id_).value();
    mount.host_id = store::kAllHosts;
    mounts.Update(mount);
}

}  // namespace lookhaven::test
