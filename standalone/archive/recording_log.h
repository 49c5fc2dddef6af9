// SPDX-License-Identifier: Apache-2.0
//
// Which seconds were recorded and why: a file of 86,400 bytes for each camera and UTC day, one byte a second, 0 where
// nothing was recorded, else the REC_METHOD.
#pragma once

#include <cstdint>
#include <filesystem>
#include <span>

namespace lookhaven::archive {

// Notes the seconds [begin_s, end_s), at most a day of them. camera_folder: <mount>/<camera>, which must exist; folders
// of days are made. Throws std::system_error.
//
// Thread safety: one writer for each camera; readers whenever they like.
void WriteRecordingLog(const std::filesystem::path& camera_folder, std::int64_t begin_s, std::int64_t end_s,
                       std::uint8_t reason);

// Fills seconds with the bytes from begin_s on; days without a log give zeros. False when there is no such folder.
bool ReadRecordingLog(const std::filesystem::path& camera_folder, std::int64_t begin_s,
                      std::span<std::uint8_t> seconds);

}  // namespace lookhaven::archive
