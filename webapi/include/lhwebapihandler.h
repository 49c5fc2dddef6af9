// SPDX-License-Identifier: Apache-2.0
//
// Base of every request handler: the request and response, admission, the caller's privilege profile, the error record.
//
// Invariants    (1) m_pPrivProfile is set at most once, under m_Mutex.
//               (2) m_pPrivProfile is destroyed before m_Mutex, and that before m_ErrParams.
// Thread safety One thread, except GetPrivProfile, which any thread of the request may call.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>

#include <json/json.h>

#include "platform/admission/cmsrelay.h"
#include "platform/admission/host.h"
#include "platform/privilege/privprofile.h"
#include "platform/webapi/apirequest.h"
#include "platform/webapi/apiresponse.h"
#include "webapi/include/diaglog.h"
#include "webapi/include/lhmutex.h"

enum LH_WEBAPI_ERR_CODE : std::int32_t {
    LH_WEBAPI_ERR_NONE = 0,
    LH_WEBAPI_ERR_NO_PERMISSION = 105,
    LH_WEBAPI_ERR_RESOURCE = 400,   // a record, stream, file or process resource could not be set up
    LH_WEBAPI_ERR_BAD_INPUT = 401,  // bad or inaccessible input
};

namespace lookhaven::webapi {

// True when the login session alone admits: application privilege, administrator, or the service's own account.
bool IsAdmittedBySession(const VEXO::APIRequest& request);
// True when a peer device presents a matching cookie pair while the recording service is up.
bool IsAdmittedByPair(const VEXO::APIRequest& request);

}  // namespace lookhaven::webapi

// Handler: the derived class. The other parameters are the types of its members that would relay a request to a
// recording server; they are part of the class's identity only, since this module relays nothing.
template <typename Handler, typename RelayToTarget, typename Relay, typename RelayWithFlag>
class LHWebAPIHandler {
  public:
    // Borrows both for the handler's life.
    LHWebAPIHandler(VEXO::APIRequest* request, VEXO::APIResponse* response)
        : m_pRequest(request),
          m_pResponse(response) {}
    virtual ~LHWebAPIHandler() { m_pPrivProfile.reset(); }
    LHWebAPIHandler(const LHWebAPIHandler&) = delete;
    LHWebAPIHandler& operator=(const LHWebAPIHandler&) = delete;

    // True when the camera may be changed from this host: it is a managing host, or owns the camera.
    virtual bool IsCamAvailiable(int camId) {
        if (IsCmsHost() || GetCamOwnerHxId(camId) == 0) {
            return true;
        }
        LH_LOG_AT("webapi/include/lhwebapihandler", 584, "IsCamAvailiable",
                  "Camera[%d]: Modify detection param while CMS closed.\n", camId);
        return false;
    }

    // The rights to send with a redirected request: none.
    virtual Json::Value GetRedirectPrivData(int) { return {}; }

    // Reads the "relayedCmd" parameter, which only counts on a managing host.
    void TakeRelayedCmd() {
        const bool relayed = m_pRequest->GetParam("relayedCmd", false).asBool();
        m_bRelayed = IsCmsHost() && relayed;
    }

  protected:
    // Admits the caller by login session, else by cookie pair. False: the caller is rejected; nothing is logged or
    // answered.
    bool Authenticate() {
        if (lookhaven::webapi::IsAdmittedBySession(*m_pRequest)) {
            return true;
        }
        if (!lookhaven::webapi::IsAdmittedByPair(*m_pRequest)) {
            return false;
        }
        m_bPairAuth = true;
        return true;
    }

    // The user whose rights count for this request.
    unsigned int GetPrivUid() const { return m_bPairAuth ? PAIR_AUTH_UID : m_pRequest->GetLoginUID(); }

    // The caller's profile, restricted by the "privData" parameter; loaded on the first call, the same object from then
    // on. Never null; lives as long as the handler. Not for handlers that must ignore "privData".
    PrivProfile* GetPrivProfile() {
        const std::lock_guard<LHMutex> lock(m_Mutex);
        if (!m_pPrivProfile) {
            m_pPrivProfile = std::make_unique<PrivProfile>();
            *m_pPrivProfile = PrivProfileGetByUid(GetPrivUid());
            m_pPrivProfile->UpdateByJson(m_pRequest->GetParam("privData", Json::Value()));
        }
        return m_pPrivProfile.get();
    }

    // Records an error for Answer; writes nothing to the response.
    void SetErrorCode(LH_WEBAPI_ERR_CODE code, std::string param1, std::string param2) {
        m_ErrCode = code;
        m_ErrParams[1] = std::move(param1);
        m_ErrParams[2] = std::move(param2);
    }

    // Answers with the recorded error if there is one, otherwise with data.
    void Answer(const Json::Value& data) {
        if (m_ErrCode == LH_WEBAPI_ERR_NONE) {
            m_pResponse->SetSuccess(data);
            return;
        }
        Json::Value params;
        params["param1"] = m_ErrParams[1];
        params["param2"] = m_ErrParams[2];
        m_pResponse->SetError(m_ErrCode, params);
    }

    VEXO::APIRequest* m_pRequest;
    VEXO::APIResponse* m_pResponse;
    bool m_bRelayed = false;
    bool m_bFlag2 = false;
    bool m_bPairAuth = false;
    LH_WEBAPI_ERR_CODE m_ErrCode = LH_WEBAPI_ERR_NONE;
    std::unique_ptr<PrivProfile> m_pPrivProfile;
    std::map<int, std::string> m_ErrParams;
    LHMutex m_Mutex;
};

// The base as this module's handlers derive from it.
template <typename Handler>
using LHHandlerBase =
    LHWebAPIHandler<Handler, int (Handler::*)(CmsRelayParams&, CmsRelayTarget&, Json::Value&),
                    int (Handler::*)(CmsRelayParams&), int (Handler::*)(CmsRelayParams&, CmsRelayTarget&, bool)>;
