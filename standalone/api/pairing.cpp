// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Pairing: what another host may ask, which has no session here but a token; or, to become a paired one, the
// secret of a code that was shown here.
#include "standalone/admin/invitation.h"
#include "standalone/api/login_log.h"
#include "standalone/api/named_list.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/password_check.h"
#include "standalone/base/clock.h"
#include "standalone/store/cameras.h"

#include "platform/admission/pairauth.h"

namespace lookhaven::api {

namespace {

// Where attempts are counted and logged.
constexpr const char* kCode = "pairing code";

std::string CookieOf(const Call& call, const std::string& name) {
    const auto found = call.cookies.find(name);
    return found == call.cookies.end() ? "" : found->second;
}

// As in the line that pairs two hosts.
Json::Value OwnCameras(const Call& call) {
    return NamedList(store::Cameras(call.Records()).List(), [](Json::Value& json, const store::Camera& camera) {
        json["video"] = static_cast<int>(camera.video_type);
        json["audio"] = camera.audio;
    });
}

std::string Cameras(const Call& call) {
    if (!IsAuthPairMatch(CookieOf(call, "token"), CookieOf(call, "timestamp"))) {
        throw Failure(401, "no token of a paired host");
    }
    Json::Value data;
    data["camera"] = OwnCameras(call);
    return SuccessAnswer(data);
}

// Throws admin::InvalidInvitation; Failure 429.
std::string TryCode(const Call& call, const std::string& address) {
    const std::string code = call.Parameter("code").asString();  // a number, where all its digits are decimal ones
    const base::BootTime now = base::TimeSinceBoot();
    admin::RequireInvitation(call.Records(), now);
    try {
        return admin::AcceptInvitation(call.Records(), code, call.Parameter("attempt").asString(), address, now);
    } catch (const admin::InvalidInvitation&) {
        // Only a wrong code counts: others in the other host's network must not block the right one.
        CountAttempt(call, kCode);
        throw;
    }
}

std::string Accept(const Call& call) {
    RequireNotInQuery(call, {"code", "attempt"});
    const std::string address(call.request.Header("REMOTE_ADDR"));
    const base::Installation& installation = call.context.Installation();
    try {
        Json::Value data;
        data["secret"] = TryCode(call, address);
        data["camera"] = OwnCameras(call);
        return SuccessAnswer(data);
    } catch (const admin::InvalidInvitation& error) {
        LogRefused(installation, kCode, address, error.what());
        throw Failure(403, error.what());
    } catch (const Failure& failure) {
        LogRefused(installation, kCode, address, failure.what());
        throw;
    }
}

constexpr Method kMethods[] = {{"Cameras", Cameras}, {"Accept", Accept, Method::Accepts::kPostOnly}};

}  // namespace

const OwnApi kPairingApi{"VEXO.Pairing", kMethods, false};

}  // namespace lookhaven::api
