// SPDX-License-Identifier: Apache-2.0
//
// What a monitor reads of the record store, of the hosts that share it, and of the database's replication.
#pragma once

#include "standalone/api/metrics_text.h"
#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::api {

// records: null when the store could not be opened.
void AddStore(MetricsText& text, store::Store* records);

// Nothing of hosts on a machine that is none, nothing of replication for SQLite. Throws store::StoreError.
void AddHosts(MetricsText& text, const base::Installation& installation, store::Store& records);

}  // namespace lookhaven::api
