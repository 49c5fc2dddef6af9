// SPDX-License-Identifier: Apache-2.0
//
// The decoder of single pictures as a shared library of its own, for programs that need it once in a while.
//
// Why so        libav brings hundreds of mappings along, and each of them makes every fork dearer. A host that forks for
//               each request loads this library in the one request process that decodes a picture.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace lookhaven::media {

constexpr const char* kStillLibrary = "liblookhaven-still.so";
constexpr const char* kStillFunction = "LookhavenStill";

// Makes a JPEG of one key frame. codec: as CodecName spells it. False, with a reason in problem, when it cannot.
using StillFunction = bool (*)(const char* codec, const std::uint8_t* data, std::size_t size_bytes,
                               std::vector<std::uint8_t>& jpeg, std::string& problem);

}  // namespace lookhaven::media
