// SPDX-License-Identifier: Apache-2.0
//
// The two ways of admission: by login session, and by the cookie pair of a peer device.
#include "webapi/include/lhwebapihandler.h"

#include "platform/admission/pairauth.h"

namespace lookhaven::webapi {
namespace {

constexpr char kApplication[] = "VEXO.VDX.Lookhaven";

bool IsPeerDevice(const std::string& client) {
    return client == "MX510LQ" || client == "NVR" || client == "REC_SERVER";
}

}  // namespace

bool IsAdmittedBySession(const VEXO::APIRequest& request) {
    if (!request.IsAuthorized()) {
        return false;
    }
    if (request.HasAppPriv(kApplication) || request.IsAdmin()) {
        return true;
    }
    const std::string userName = request.GetLoginUserName();
    return userName == "Lookhaven" || SDKUser::AppPrivUserHas(userName, kApplication, request.GetRemoteIP());
}

bool IsAdmittedByPair(const VEXO::APIRequest& request) {
    const bool isRunning = IsLHRunning();
    const int isCrossSite = request.GetParam("isCrossSite", 0).asInt();
    const std::string client = request.GetParam("client", "").asString();
    if (!IsPeerDevice(client) || !isRunning) {
        return false;
    }
    // The placeholders for missing values are not empty: the matcher has to reject them.
    const std::string cookie = request.GetParam("cookie", "FailedCookie").asString();
    const std::string timestamp = request.GetCookie("timestamp", "FailedTiemstamp");
    if (cookie.empty() || timestamp.empty()) {
        return false;
    }
    return isCrossSite == 1 ? SlaveHxAuthentication().IsAuthByPairMatch(cookie, timestamp)
                            : IsAuthPairMatch(cookie, timestamp);
}

}  // namespace lookhaven::webapi
