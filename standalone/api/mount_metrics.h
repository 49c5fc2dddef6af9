// SPDX-License-Identifier: Apache-2.0
//
// What a monitor reads of this host's mounts: their space, and what the recorder deletes there.
#pragma once

#include "standalone/api/metrics_text.h"
#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::api {

// Throws store::StoreError.
void AddMounts(MetricsText& text, const base::Installation& installation, store::Store& records);

}  // namespace lookhaven::api
