// SPDX-License-Identifier: Apache-2.0
//
// Opens, writes and removes the files of a mount without leaving it.
//
// Why so        Others may be allowed to write to a disk of recordings. A symbolic link that they put there must not
//               make us read or overwrite a file elsewhere, and a pipe must not block us. The mount itself may be
//               reached through a link. Its folders are opened one after the other without following links, rather than
//               by openat2, which older kernels and the system call filters of many containers lack.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::archive {

// The paths are <mount>/<camera>/<day>/<file>, with or without their first folders: what is named like a day's folder,
// and like a camera's above it, is below the mount, and so is the file. Unless noted, all functions throw
// std::system_error.

// Opens a regular file; anything else is refused with ELOOP. flags and mode are open's.
base::FileDescriptor OpenFile(const std::filesystem::path& path, int flags, unsigned int mode = 0640);
// The same, and creates the day's folder if it is missing. Never the camera's, which must exist.
base::FileDescriptor OpenFileInNewDay(const std::filesystem::path& path, int flags, unsigned int mode = 0640);

std::uint64_t SizeOf(const base::FileDescriptor& file, const std::filesystem::path& path);
// Reads at most the file's first max_bytes bytes.
std::string ReadFile(const std::filesystem::path& path, std::size_t max_bytes);
// Replaces the file in one step, and what else has its name, but for a folder.
void WriteFileAtomically(const std::filesystem::path& path, std::string_view contents, unsigned int mode = 0640);
// Gives the file another name in the same folder.
void RenameFile(const std::filesystem::path& path, const std::string& name);
// False when there is none or it cannot be removed. Throws nothing.
bool RemoveFile(const std::filesystem::path& path) noexcept;

// Creates the folder, and the one above it, when they are missing and are a day's and a camera's. Never the mount.
void MakeFolders(const std::filesystem::path& folder);

}  // namespace lookhaven::archive
