// SPDX-License-Identifier: Apache-2.0
//
// What the web API, the audit log and the command line call the values of records.
#pragma once

#include "standalone/base/names.h"
#include "standalone/store/devices.h"
#include "standalone/store/marks.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/users.h"

namespace lookhaven::store {

const base::Names<RecordMode>& RecordModeNames();      // always, never, schedule
const base::Names<Privilege>& PrivilegeNames();        // owner, manager, viewer
const base::Names<CameraAccess>& CameraAccessNames();  // live, playback, audio, export
const base::Names<MarkKind>& MarkKindNames();          // alert, pos
const base::Names<EmapItemType>& DeviceKindNames();    // door, io, pos
const base::Names<PortType>& PortTypeNames();          // in, out
const base::Names<int>& ProfileNames();                // of a camera's profiles: high, low, mobile

}  // namespace lookhaven::store
