// SPDX-License-Identifier: Apache-2.0
//
// The APIs of the standalone platform, besides those of the loaded modules: one table in one file for each.
//
// A new API has a row in FindOwnApi, a page in docs/api, and, where it takes a POST, a place in the web server's list
// of APIs that are no log-in (packaging/nginx).
#pragma once

#include <span>
#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

struct Method {
    const char* name;
    // The whole answer; empty when it went to standard output already. Throws Failure for what the caller did wrong or
    // cannot have.
    std::string (*serve)(const Call& call);
    // POST alone for what changes anything, or has parameters or answers that belong in no log, such as accounts.
    enum class Accepts { kGetAndPost, kPostOnly } accepts = Accepts::kGetAndPost;
    enum class Audience { kEverybody, kManagers } audience = Audience::kEverybody;
};

// Every API is at version 1.
struct OwnApi {
    const char* name;
    std::span<const Method> methods;
    bool needs_session = true;  // where it is false, what is for managers needs one all the same

    // Throws Failure 404 when it has no such method.
    const Method& Find(int version, const std::string& method) const;
};

extern const OwnApi kAuthApi;      // log in, log out, who am I; the first account
extern const OwnApi kCameraApi;    // cameras as a manager sets them up
extern const OwnApi kCatalogApi;   // camera groups, mounts and e-maps that the caller may see
extern const OwnApi kDeviceApi;    // doors, I/O modules and POS terminals as a manager sets them up
extern const OwnApi kEmapApi;      // e-maps, what their editor needs, and the states of doors and ports
extern const OwnApi kEventApi;     // report what happened at a camera, list it, stream and download its footage
extern const OwnApi kGroupApi;     // camera groups as a manager sets them up
extern const OwnApi kHostApi;      // what only another host of the same store may ask
extern const OwnApi kMountApi;     // storage mounts: how full, for how long, and their limits
extern const OwnApi kPairingApi;   // what a paired host may ask, and one that pairs by a code
extern const OwnApi kPictureApi;   // one JPEG of a camera, whatever codec it sends
extern const OwnApi kPlaybackApi;  // controls a running player of the caller's session
extern const OwnApi kRelayApi;     // the live view of a paired host's camera on this host's origin
extern const OwnApi kServerApi;    // the hosts that this one is paired with, for managers
extern const OwnApi kSystemApi;    // health, metrics, checks, audit log and settings of the installation
extern const OwnApi kTokenApi;     // access tokens of analytics boxes and POS terminals, for managers
extern const OwnApi kUserApi;      // accounts, their rights and sessions; everybody's own account

// Null when there is no such API.
const OwnApi* FindOwnApi(const std::string& name);

}  // namespace lookhaven::api
