// SPDX-License-Identifier: Apache-2.0
//
// Which seconds were recorded and why: a file of 86,400 bytes per camera and UTC day, one byte per second: 0 where
// nothing was recorded, else base::kReasonContinuous or kReasonAlarm.
#pragma once

#include <cstdint>
#include <filesystem>
#include <span>

namespace lookhaven::archive {

// Sets the seconds [begin_s, end_s), at most a day, to the reason; 0 clears them. camera_folder: <mount>/<camera>,
// which must exist; folders of days are created. Throws std::system_error.
//
// Thread safety: one writer per camera, any number of readers.
void WriteRecordingLog(const std::filesystem::path& camera_folder, std::int64_t begin_s, std::int64_t end_s,
                       std::uint8_t reason);

// Fills seconds with the bytes from begin_s on; a day whose log is missing or cannot be read gives zeros. False when
// the camera's folder does not exist.
bool ReadRecordingLog(const std::filesystem::path& camera_folder, std::int64_t begin_s,
                      std::span<std::uint8_t> seconds);

}  // namespace lookhaven::archive
