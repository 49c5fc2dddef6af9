// SPDX-License-Identifier: Apache-2.0
//
// lookhaven-camera: reads one camera for the recorder, confined; see docs/design/cameras.md. Not for users: it expects
// a socket as descriptor 3.
#include <csignal>
#include <cstring>
#include <exception>
#include <optional>
#include <string_view>

#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/uio.h>
#include <sysexits.h>
#include <unistd.h>

#include "standalone/base/io.h"
#include "standalone/camera/camera_process.h"
#include "standalone/camera/confinement.h"
#include "standalone/camera/messages.h"
#include "standalone/camera/resolver_guard.h"

namespace {

using namespace lookhaven;
using namespace lookhaven::camera;

// The recorder is gone: nobody is left to tell.
[[noreturn]] void Leave() {
    ::_exit(EX_OK);
}

void Send(MessageHead head, std::span<const std::uint8_t> body) {
    head.body_bytes = static_cast<std::uint32_t>(body.size());
    iovec parts[] = {{&head, sizeof head}, {const_cast<std::uint8_t*>(body.data()), body.size()}};
    msghdr message{};
    message.msg_iov = parts;
    message.msg_iovlen = 2;
    const ssize_t sent = ::sendmsg(kSocketOfProcess, &message, MSG_NOSIGNAL);
    if (sent < static_cast<ssize_t>(sizeof head)) {
        Leave();
    }
    const auto rest = body.subspan(static_cast<std::size_t>(sent) - sizeof head);
    if (!rest.empty() && !base::WriteAll(kSocketOfProcess, rest.data(), rest.size())) {
        Leave();
    }
}

void Send(MessageType type, std::span<const std::uint8_t> body = {}, media::Medium medium = media::Medium::kVideo,
          std::uint8_t flags = 0, std::int64_t timestamp_us = 0) {
    Send({static_cast<std::uint8_t>(type), static_cast<std::uint8_t>(medium), flags, 0, 0, timestamp_us}, body);
}

void SendFailure(std::string_view reason, base::SignalLoss cause) {
    const std::string redirect =
        "it redirects to " + RefusedHost() + ", which is not followed: give that address if it is the camera's";
    if (!RefusedHost().empty()) {
        reason = redirect;
        cause = base::SignalLoss::kOther;
    }
    reason = reason.substr(0, kMaxFailureBytes);
    Send(MessageType::kFailure, {reinterpret_cast<const std::uint8_t*>(reason.data()), reason.size()},
         media::Medium::kVideo, static_cast<std::uint8_t>(cause));
}

Request Receive() {
    std::uint32_t size = 0;
    if (base::ReadAll(kSocketOfProcess, &size, sizeof size) != sizeof size) {
        Leave();
    }
    std::vector<std::uint8_t> bytes(size);
    if (base::ReadAll(kSocketOfProcess, bytes.data(), size) != size) {
        Leave();
    }
    return DecodeRequest(bytes);
}

void Confine() {
    const Confinement confinement = ConfineThisProcess();
    Send(MessageType::kConfined, {}, media::Medium::kVideo,
         static_cast<std::uint8_t>((confinement.has_landlock ? 0 : kLacksLandlock) |
                                   (confinement.has_system_call_filter ? 0 : kLacksSystemCallFilter)));
}

// Leaves by an exception only.
void Run(const Request& request) {
    PermitHostOf(request.url);
    const auto source = media::OpenSource(media::CameraKinds(), request.url, request.options, {});
    if (source->Audio()) {
        Send(MessageType::kFormat, EncodeFormat(*source->Audio()), media::Medium::kAudio);
    }
    Send(MessageType::kOpened);
    std::optional<media::StreamFormat> video;
    for (;;) {
        const media::Packet packet = source->Next();
        if (packet.medium == media::Medium::kVideo && video != *packet.format) {
            video = *packet.format;
            Send(MessageType::kFormat, EncodeFormat(*video));
        }
        Send(MessageType::kFrame, packet.data, packet.medium, packet.key_frame ? kKeyFrame : 0, packet.timestamp_us);
    }
}

}  // namespace

int main() {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    std::signal(SIGPIPE, SIG_IGN);  // the camera's connection may break while it is written to
    try {
        const Request request = Receive();  // also ends a process whose recorder died before the line above
        Confine();
        Run(request);
    } catch (const media::SourceError& failure) {
        SendFailure(failure.what(), failure.Cause());
    } catch (const std::exception& failure) {
        SendFailure(failure.what(), base::SignalLoss::kOther);
    }
    // Nothing to unwind, and the confinement would fail what a sanitizer does at the end.
    ::_exit(EX_OK);
}
