// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/download.h"

#include <string>

#include <unistd.h>

#include "standalone/api/attachment.h"
#include "standalone/api/decoder_sandbox.h"
#include "standalone/api/footage.h"
#include "standalone/base/clock.h"
#include "standalone/binding/rights.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/store/cameras.h"

namespace lookhaven::api {

namespace {

// "Entrance 2026-03-01 08.15.30Z", or in the client's zone "Entrance 2026-03-01 09.15.30".
std::string TitleOf(const Call& call, const Footage& footage) {
    const int offset_min = UtcOffset(call);
    const auto camera = store::Cameras(call.Records()).Find(footage.camera_id);
    std::string time = base::FormatUtc((footage.start_s + offset_min * 60) * 1000);  // 2026-03-01T08:15:30.000Z
    time = time.substr(0, 10) + ' ' + time.substr(11, 2) + '.' + time.substr(14, 2) + '.' + time.substr(17, 2) +
           (call.Parameter("utc_offset_min").isNull() ? "Z" : "");
    return (camera ? camera->name : "Camera " + std::to_string(footage.camera_id)) + ' ' + time;
}

}  // namespace

std::string Download(const Call& call) {
    const Footage footage = RequireFootage(call, store::CameraAccess::kExport);
    media::ExportOptions options;
    options.with_sound = binding::MayUse(footage.camera_id, store::CameraAccess::kAudio);
    const std::string name = TitleOf(call, footage) + ".mkv";
    options.announce = [&name](std::int64_t size_bytes) { SendAttachmentHead("video/x-matroska", name, size_bytes); };
    call.context.NoteStream();
    OpenFootage(call, footage, 0);  // while an error answer is still possible
    LogFootageSent(call, "a download", "camera " + std::to_string(footage.camera_id),
                   {footage.start_s * 1000, footage.end_s * 1000});
    const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
    call.slots.KeepOnly(call.slot);
    const base::Installation& installation = call.context.Installation();
    // The copier reads what a camera has sent.
    EnterPlaybackSandbox(installation, PlaybackFilter(installation.StoreUrl()));
    SendUntilClientLeaves([&] { remux.Copy(footage.path, STDOUT_FILENO, options); });
    return "";
}

}  // namespace lookhaven::api
