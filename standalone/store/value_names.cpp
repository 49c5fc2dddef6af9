// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/value_names.h"

namespace lookhaven::store {

const base::Names<RecordMode>& RecordModeNames() {
    static const base::Names<RecordMode> names = {
        {"always", RecordMode::kAlways}, {"never", RecordMode::kNever}, {"schedule", RecordMode::kSchedule}};
    return names;
}

const base::Names<Privilege>& PrivilegeNames() {
    static const base::Names<Privilege> names = {
        {"owner", Privilege::kOwner}, {"manager", Privilege::kManager}, {"viewer", Privilege::kViewer}};
    return names;
}

const base::Names<CameraAccess>& CameraAccessNames() {
    static const base::Names<CameraAccess> names = {{"live", CameraAccess::kLive},
                                                    {"playback", CameraAccess::kPlayback},
                                                    {"audio", CameraAccess::kAudio},
                                                    {"export", CameraAccess::kExport}};
    return names;
}

const base::Names<MarkKind>& MarkKindNames() {
    static const base::Names<MarkKind> names = {{"alert", MarkKind::kAlert}, {"pos", MarkKind::kPos}};
    return names;
}

const base::Names<EmapItemType>& DeviceKindNames() {
    static const base::Names<EmapItemType> names = {
        {"door", EmapItemType::kDoor}, {"io", EmapItemType::kIoModule}, {"pos", EmapItemType::kPos}};
    return names;
}

const base::Names<PortType>& PortTypeNames() {
    static const base::Names<PortType> names = {{"in", PortType::kInput}, {"out", PortType::kOutput}};
    return names;
}

const base::Names<int>& ProfileNames() {
    static const base::Names<int> names = {{"high", 0}, {"low", 1}, {"mobile", 2}};
    return names;
}

}  // namespace lookhaven::store
