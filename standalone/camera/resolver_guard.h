// SPDX-License-Identifier: Apache-2.0
//
// The one host that lookhaven-camera looks up.
//
// Why so        A camera may redirect its reader, over HTTP and RTSP alike, and libav follows: to any address of the
//               network, and to this machine's own. Whether a name or a number, libav looks it up first. So this
//               program has a getaddrinfo of its own, in front of the C library's.
#pragma once

#include <string>
#include <string_view>

namespace lookhaven::camera {

// From now on the host of the URL is found, some times, and no other. Before, none is.
void PermitHostOf(std::string_view url);

// The host that was last refused; empty when none was.
const std::string& RefusedHost();

}  // namespace lookhaven::camera
