// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Relay: the live view of a recording server's camera on this host's origin.
//
// Why so        A browser has no session at the other server. This host checks whether the caller may see the camera,
//               and has the web server fetch it with a token that is valid for minutes; secret and token never reach
//               the browser.
#include "standalone/api/own_apis.h"

#include <memory>

#include <netdb.h>
#include <sys/socket.h>

#include "standalone/base/clock.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/binding/pair_token.h"
#include "standalone/binding/rights.h"
#include "standalone/store/servers.h"

namespace lookhaven::api {

namespace {

// Sends nothing: a datagram socket can be connected only where there is a route.
bool HasRoute(const addrinfo& address) {
    const base::FileDescriptor probe(::socket(address.ai_family, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    return probe && ::connect(probe.Get(), address.ai_addr, address.ai_addrlen) == 0;
}

// Names are resolved here: the web server would resolve them once, when it starts, and not start when one fails.
std::string NumericAddress(const std::string& name, int port) {
    addrinfo hints{};
    hints.ai_socktype = SOCK_STREAM;
    addrinfo* found = nullptr;
    if (::getaddrinfo(name.c_str(), std::to_string(port).c_str(), &hints, &found) == 0) {
        const std::unique_ptr<addrinfo, decltype(&::freeaddrinfo)> owned(found, ::freeaddrinfo);
        for (const addrinfo* each = found; each != nullptr; each = each->ai_next) {
            char text[NI_MAXHOST];
            if (HasRoute(*each) &&
                ::getnameinfo(each->ai_addr, each->ai_addrlen, text, sizeof text, nullptr, 0, NI_NUMERICHOST) == 0) {
                return each->ai_family == AF_INET6 ? "[" + std::string(text) + "]" : text;
            }
        }
    }
    throw Failure(502, "the recording server's host name cannot be resolved");
}

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
    if (!server || !camera || server->address.empty() || secret.empty()) {
        throw Failure(404, "there is no such camera on a recording server");
    }
    if (!binding::MayUse(camera->id, store::CameraAccess::kLive)) {
        throw Failure(403, "you may not see this camera");
    }
    const std::string id = std::to_string(camera->id_on_server);
    const std::string timestamp = std::to_string(base::WallMillis() / 1000);
    std::string query = "api=VEXO.Lookhaven.Player.LiveviewSrc&version=1&method=Play&client=REC_SERVER&camera=" + id +
                        Passed(call, "snapshot") + Passed(call, "profileType") +
                        "&cookie=" + binding::MakePairToken(secret, timestamp);
    if (!binding::MayUse(camera->id, store::CameraAccess::kAudio)) {
        query += "&privData=%7B%22deniedAudio%22%3A%5B" + id + "%5D%7D";
    }
    return "Status: 200 OK\r\nX-Accel-Redirect: /relay/" + std::to_string(server_id) + "/" +
           NumericAddress(server->address, server->port) + "/" + std::to_string(server->port) + "/" + timestamp + "?" +
           query + "\r\nContent-Length: 0\r\n\r\n";
}

constexpr Method kMethods[] = {{"Play", Play}};

}  // namespace

const OwnApi kRelayApi{"VEXO.Relay", kMethods};

}  // namespace lookhaven::api
