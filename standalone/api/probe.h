// SPDX-License-Identifier: Apache-2.0
//
// Looks at the stream of an address: what it sends, and a picture of it.
//
// Why so        A request process never parses what a camera sends. The bytes are parsed by a confined process of their
//               own, as the recorder has it done; the one key frame that comes of it is decoded only once this process
//               has given up all but its connection.
#pragma once

#include <string>

#include "standalone/api/call.h"

namespace lookhaven::api {

// The method Probe of VEXO.Camera. Confines this process. Throws Failure 429 while three probes are running.
std::string ProbeCamera(const Call& call);

}  // namespace lookhaven::api
