// SPDX-License-Identifier: Apache-2.0
//
// The name of the cookie that carries a session's secret.
#pragma once

namespace lookhaven::api {

constexpr const char* kSessionCookie = "id";

}  // namespace lookhaven::api
