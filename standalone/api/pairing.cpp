// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Pairing: what a paired host may ask, which has no session here but a token.
#include "standalone/api/own_apis.h"

#include "platform/admission/pairauth.h"
#include "standalone/api/named_list.h"
#include "standalone/store/cameras.h"

namespace lookhaven::api {

namespace {

std::string CookieOf(const Call& call, const std::string& name) {
    const auto found = call.cookies.find(name);
    return found == call.cookies.end() ? "" : found->second;
}

// As in the line that pairs two hosts.
std::string Cameras(const Call& call) {
    if (!IsAuthPairMatch(CookieOf(call, "token"), CookieOf(call, "timestamp"))) {
        throw Failure(401, "no token of a paired host");
    }
    Json::Value data;
    data["camera"] =
        NamedList(store::Cameras(call.Records()).List(), [](Json::Value& json, const store::Camera& camera) {
            json["video"] = static_cast<int>(camera.video_type);
            json["audio"] = camera.audio;
        });
    return SuccessAnswer(data);
}

constexpr Method kMethods[] = {{"Cameras", Cameras}};

}  // namespace

const OwnApi kPairingApi{"VEXO.Pairing", kMethods, false};

}  // namespace lookhaven::api
