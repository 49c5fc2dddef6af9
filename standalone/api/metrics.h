// SPDX-License-Identifier: Apache-2.0
//
// What a monitor reads from time to time: counts and states of recorder, requests, mounts and store.
#pragma once

#include <string>

#include "standalone/api/call.h"
#include "standalone/store/store.h"

namespace lookhaven::api {

// In Prometheus' text format. records: the store, or null when it could not be opened.
std::string MetricsOf(const Call& call, store::Store* records);

}  // namespace lookhaven::api
