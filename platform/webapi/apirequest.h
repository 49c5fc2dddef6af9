// SPDX-License-Identifier: Apache-2.0
//
// One web API request as the framework hands it to an entry function.
#pragma once

#include <string>

#include <json/json.h>

#include "platform/export.h"

namespace VEXO {

// Parameters by name, the caller's login and address. Owned by the framework; valid until the entry function returns.
//
// Thread safety: one thread.
class LH_PLATFORM_API APIRequest {
  public:
    // The framework's own data behind the request.
    struct Context;
    // Borrows context, which outlives the request.
    explicit APIRequest(Context& context);

    // The parameter, or defaultValue when the request does not carry it. Its JSON type is the client's choice, so that
    // conversions of the result may throw Json::Exception; a text default such as "-1" may come back as a number. The
    // empty name gives all parameters as one object, without secrets.
    Json::Value GetParam(const std::string& name, const Json::Value& defaultValue) const;

    // The method that the request names, as sent; empty when it names none.
    std::string GetAPIMethod() const;

    // The caller's login; 0 and empty texts without a session.
    unsigned int GetLoginUID() const;
    std::string GetLoginUserName() const;
    // A public handle of the login session that can be part of a file name; never the secret that the browser holds.
    std::string GetSessionID() const;

    // The caller's address as text.
    std::string GetRemoteIP() const;
    // The cookie that the request carries under name, else defaultValue.
    std::string GetCookie(const std::string& name, const std::string& defaultValue) const;

    // True when the framework found a valid login session.
    bool IsAuthorized() const;
    // True when the session's user administers this host.
    bool IsAdmin() const;
    // True when the session itself carries the privilege for the application.
    bool HasAppPriv(const std::string& application) const;

  private:
    Context* m_pContext;
};

}  // namespace VEXO
