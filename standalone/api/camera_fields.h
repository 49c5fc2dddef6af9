// SPDX-License-Identifier: Apache-2.0
//
// The fields of a camera's record, out of the parameters of a call.
#pragma once

#include <string>

#include "standalone/admin/cameras.h"
#include "standalone/api/call.h"
#include "standalone/camera/isolated_source.h"

namespace lookhaven::api {

// Changes in the setup what the call names. A stored password goes to no other server (scheme, host, port) than those
// that the camera has, nor to one whose certificate is no longer verified: a user who may replace it may not read it.
// Throws Failure 400.
void TakeCameraFields(const Call& call, admin::CameraSetup& setup);

// The account and password of the call for those addresses; those stored where it names none. Throws Failure 400 as
// above.
std::optional<store::Credentials> TakeCredentials(const Call& call, const admin::CameraSetup& stored,
                                                  const std::vector<std::string>& addresses, bool insecure);

}  // namespace lookhaven::api
