// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Relay: the live view of a paired host's camera on this host's origin.
//
// Why so        A browser has no session at the paired host. This host checks whether the caller may see the camera,
//               and fetches it with a token that is valid for minutes; secret and token never reach the browser. The
//               request process holds the connection to the paired host, so what ends any stream ends this one.
#include "standalone/api/own_apis.h"

#include <poll.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/binding/rights.h"
#include "standalone/remote/fetch.h"
#include "standalone/remote/pair_token.h"
#include "standalone/store/servers.h"

namespace lookhaven::api {

namespace {

// Sends the answer on as this host's own.
class Relay : public remote::Sink {
  public:
    explicit Relay(const Call& call) : call_(call), output_(*call.context.output()) {}

    bool Begin(std::string_view content_type, std::int64_t size) override {
        if (content_type.find("image/") != 0) {
            call_.context.NoteStream();
        }
        const std::string length = size < 0 ? "" : "Content-Length: " + std::to_string(size) + "\r\n";
        const std::string head =
            "Status: 200 OK\r\nCache-Control: no-store\r\nContent-Type: " + std::string(content_type) + "\r\n" +
            length + "\r\n";
        return Write(head);
    }

    bool Write(std::span<const char> bytes) override {
        iovec piece{const_cast<char*>(bytes.data()), bytes.size()};
        return output_.Send({&piece, 1});
    }

    // A viewer who has gone shows only where something is sent.
    bool WantsMore() override {
        pollfd viewer{STDOUT_FILENO, POLLRDHUP, 0};
        return !call_.slot.MustEnd() && (::poll(&viewer, 1, 0) <= 0 || (viewer.revents & (POLLRDHUP | POLLHUP)) == 0);
    }

  private:
    const Call& call_;
    binding::Output& output_;
};

// "&name=number" when it was given.
std::string Passed(const Call& call, const char* name) {
    const Json::Value& value = call.Parameter(name);
    return value.isNull() ? "" : std::string("&") + name + "=" + std::to_string(value.asInt());
}

std::string Play(const Call& call) {
    store::RecordingServers servers(call.Records());
    const int server_id = call.Parameter("server").asInt();
    const auto server = servers.Find(server_id);
    const auto camera = servers.FindCamera(server_id, call.Parameter("camera").asInt());
    const std::string secret = servers.FindSecret(server_id);
    if (!server || !camera || server->address.empty() || secret.empty() ||
        !binding::MayUse(camera->id, store::CameraAccess::kLive)) {
        throw Failure(404, kNoSuchCamera);
    }
    const std::string id = std::to_string(camera->id_on_server);
    const std::string timestamp = std::to_string(base::WallSeconds());
    remote::Request request;
    request.query = "api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Play&client=REC_SERVER&camera=" + id +
                    Passed(call, "snapshot") + Passed(call, "profileType");
    request.cookie = "timestamp=" + timestamp;
    request.form = "cookie=" + remote::MakePairToken(secret, timestamp);
    if (!binding::MayUse(camera->id, store::CameraAccess::kAudio)) {
        request.form += "&privData=%7B%22deniedAudio%22%3A%5B" + id + "%5D%7D";
    }
    call.slot.pairing = store::PairingId(secret);
    call.context.CloseRecords();
    Relay relay(call);
    try {
        remote::FetchLiveView({server->address, server->port, server->certificate}, request, relay);
    } catch (const remote::NoAnswer& error) {
        base::LogWarning("no live view from " + server->name + ": " + error.what());
        throw Failure(502, "the paired host does not answer, or does not let this one in");
    }
    return "";
}

constexpr Method kMethods[] = {{"Play", Play}};

}  // namespace

const OwnApi kRelayApi{"VEXO.Relay", kMethods};

}  // namespace lookhaven::api
