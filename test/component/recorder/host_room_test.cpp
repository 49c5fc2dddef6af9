// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/host_room.h"

#include <gtest/gtest.h>

namespace lookhaven::recorder {
namespace {

using enum maintenance::MountState;
using Recording = maintenance::RecordingState;
using Room = store::HostRoom;

TEST(HostRoomTest, CamerasStayWhereTheyAreRecordedAndComeWhereThereIsSpace) {
    const struct {
        std::vector<maintenance::MountState> mounts;
        std::vector<maintenance::RecordingState> cameras;
        Room room;
    } rows[] = {
        {{}, {}, Room::kNone},
        {{kNotMounted, kReady}, {}, Room::kFree},
        {{kReady}, {Recording::kRecording, Recording::kDiskFull}, Room::kFull},
        {{kKeptFull, kInUse}, {}, Room::kFull},
        {{kSpaceHeld}, {}, Room::kFull},
        {{kInUse, kNotMounted}, {Recording::kRecording}, Room::kNone},
        {{kFailing}, {Recording::kDiskFails}, Room::kNone},
        {{kFailing}, {Recording::kDiskFails, Recording::kRecording}, Room::kFull},
        {{kFailing, kReady}, {Recording::kRecording}, Room::kFree},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        std::vector<maintenance::MountStatus> mounts;
        for (const maintenance::MountState state : row.mounts) {
            mounts.push_back({static_cast<int>(mounts.size()) + 1, state, ""});
        }
        std::map<int, maintenance::CameraStatus> cameras;
        for (const maintenance::RecordingState state : row.cameras) {
            const int id = static_cast<int>(cameras.size()) + 1;
            cameras[id] = {id, state};
        }
        EXPECT_EQ(RoomOf(mounts, cameras), row.room);
    }
}

}  // namespace
}  // namespace lookhaven::recorder
