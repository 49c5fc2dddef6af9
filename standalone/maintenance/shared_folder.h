// SPDX-License-Identifier: Apache-2.0
//
// Where a shared mount (store/shared_mounts.h) can be read now: on this host, or only on others.
#pragma once

#include "standalone/base/installation.h"
#include "standalone/store/mounts.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// Whether the mount's folder can be opened on this host. Throws store::StoreError.
bool IsMountedHere(store::Store& store, const store::Mount& mount);

// Whether the mount is shared, and not mounted here, but on another host that the recorder of this one reports as
// online. False where its folder fails to open for another reason than that it is absent: that is trouble of this
// host. Throws store::StoreError, std::system_error.
bool IsOnlyOnOtherHosts(const base::Installation& installation, store::Store& store, const store::Mount& mount);

}  // namespace lookhaven::maintenance
