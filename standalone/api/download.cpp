// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/download.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <string>
#include <system_error>

#include <unistd.h>

#include "standalone/api/decoder_sandbox.h"
#include "standalone/api/footage.h"
#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/base/text.h"
#include "standalone/binding/rights.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/store/cameras.h"

namespace lookhaven::api {

namespace {

constexpr std::int64_t kMaxOffsetMinutes = 24 * 60;

// "Entrance 2026-03-01 08.15.30Z", or in the client's zone "Entrance 2026-03-01 09.15.30".
std::string TitleOf(const Call& call, const Footage& footage) {
    const std::int64_t offset_min = call.NumberOr("utc_offset_min", 0);
    if (offset_min < -kMaxOffsetMinutes || offset_min > kMaxOffsetMinutes) {
        throw Failure(400, "utc_offset_min is out of its bounds");
    }
    const auto camera = store::Cameras(call.Records()).Find(footage.camera_id);
    std::string time = base::FormatUtc((footage.start_s + offset_min * 60) * 1000);  // 2026-03-01T08:15:30.000Z
    time = time.substr(0, 10) + ' ' + time.substr(11, 2) + '.' + time.substr(14, 2) + '.' + time.substr(17, 2) +
           (call.Parameter("utc_offset_min").isNull() ? "Z" : "");
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

std::string Download(const Call& call) {
    const Footage footage = RequireFootage(call);
    media::ExportOptions options;
    options.with_sound = binding::MayUse(footage.camera_id, store::CameraAccess::kAudio);
    const std::string head = "Status: 200 OK\r\nContent-Type: video/x-matroska\r\nCache-Control: no-store\r\n"
                             "Content-Disposition: " +
                             Disposition(TitleOf(call, footage)) + "\r\nContent-Length: ";
    // Announced, so that a copy that fails midway is seen to be cut.
    options.announce = [&head](std::int64_t size_bytes) {
        const std::string whole = head + std::to_string(size_bytes) + "\r\n\r\n";
        std::fwrite(whole.data(), 1, whole.size(), stdout);
        std::fflush(stdout);
    };
    call.context.NoteStream();
    OpenFootage(call, footage, 0);  // while an error answer is still possible
    const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
    call.slots.KeepOnly(call.slot);
    const base::Installation& installation = call.context.Installation();
    // The copier reads what a camera has sent.
    EnterPlaybackSandbox(installation, PlaybackFilter(installation.StoreUrl()));
    try {
        remux.Copy(footage.path, STDOUT_FILENO, options);
    } catch (const std::system_error& error) {
        if (error.code() != std::errc::broken_pipe && error.code() != std::errc::connection_reset) {
            throw;
        }  // else the client has gone, which is no failure
    }
    return "";
}

}  // namespace lookhaven::api
