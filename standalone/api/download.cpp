// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/download.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <filesystem>
#include <string>
#include <system_error>

#include <unistd.h>

#include "standalone/api/decoder_sandbox.h"
#include "standalone/archive/recording_reader.h"
#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/base/text.h"
#include "standalone/binding/rights.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"

namespace lookhaven::api {

namespace {

struct Footage {
    int camera_id = 0;
    int mount_id = 0;
    std::int64_t start_s = 0;
    std::string path;  // relative to the mount
};

std::optional<Footage> Find(store::Store& records, std::optional<store::MarkKind> kind, int id) {
    if (kind) {
        const auto mark = store::Marks(records).Find(*kind, id);
        const bool saved = mark && mark->state == store::MarkState::kSaved && !mark->demo;
        return saved ? std::optional(Footage{mark->camera_id, mark->mount_id, mark->start_s, mark->path})
                     : std::nullopt;
    }
    const auto event = store::Events(records).Find(id);
    return event && !event->demo
               ? std::optional(Footage{event->camera_id, event->mount_id, event->start_s, event->path})
               : std::nullopt;
}

// "Entrance 2026-03-01 08.15.30Z"
std::string TitleOf(store::Store& records, const Footage& footage) {
    const auto camera = store::Cameras(records).Find(footage.camera_id);
    std::string time = base::FormatUtc(footage.start_s * 1000);  // 2026-03-01T08:15:30.000Z
    time = time.substr(0, 10) + ' ' + time.substr(11, 2) + '.' + time.substr(14, 2) + '.' + time.substr(17, 2) + 'Z';
    return (camera ? camera->name : "Camera " + std::to_string(footage.camera_id)) + ' ' + time;
}

// The plain form for every client, and the encoded one, which keeps the camera's name as it is.
std::string Disposition(const std::string& title) {
    std::string plain = title + ".mkv";
    const std::string encoded = base::PercentEncode(plain, ".-");
    std::replace_if(
        plain.begin(), plain.end(),
        [](unsigned char c) { return std::isalnum(c) == 0 && c != '.' && c != '-' && c != ' '; }, '_');
    return "attachment; filename=\"" + plain + "\"; filename*=UTF-8''" + encoded;
}

}  // namespace

void Download(const Call& call, std::optional<store::MarkKind> kind, int event) {
    store::Store& records = call.Records();
    const auto footage = Find(records, kind, event);
    const auto mount = footage ? store::Mounts(records).Find(footage->mount_id) : std::nullopt;
    const auto path = mount ? std::filesystem::path(mount->path) / footage->path : std::filesystem::path();
    if (!mount || !binding::MayUse(footage->camera_id, store::CameraAccess::kPlayback) ||
        !std::filesystem::exists(path)) {
        throw Failure(404, "there is no such event, or no footage of it");
    }
    media::ExportOptions options;
    options.with_sound = binding::MayUse(footage->camera_id, store::CameraAccess::kAudio);
    const std::string head = "Status: 200 OK\r\nContent-Type: video/x-matroska\r\nCache-Control: no-store\r\n"
                             "Content-Disposition: " +
                             Disposition(TitleOf(records, *footage)) + "\r\nContent-Length: ";
    // Announced, so that a copy that fails midway is seen to be cut.
    options.announce = [&head](std::int64_t size_bytes) {
        const std::string whole = head + std::to_string(size_bytes) + "\r\n\r\n";
        std::fwrite(whole.data(), 1, whole.size(), stdout);
        std::fflush(stdout);
    };
    call.context.CloseRecords();
    call.context.NoteStream();
    // Checked while an error answer is still possible.
    if (archive::RecordingReader(path).FrameCount() == 0) {
        throw Failure(404, "nothing of the event is recorded yet");
    }
    const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
    call.slots.KeepOnly(call.slot);
    const base::Installation& installation = call.context.Installation();
    // The copier reads what a camera has sent.
    EnterPlaybackSandbox(installation, PlaybackFilter(installation.StoreUrl()));
    try {
        remux.Copy(path, STDOUT_FILENO, options);
    } catch (const std::system_error& error) {
        if (error.code() != std::errc::broken_pipe && error.code() != std::errc::connection_reset) {
            throw;
        }  // else the client has gone, which is no failure
    }
}

}  // namespace lookhaven::api
