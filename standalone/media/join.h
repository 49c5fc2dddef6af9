// SPDX-License-Identifier: Apache-2.0
//
// Joins parts of a camera's recordings into one file without re-encoding, as a stream whose size is known beforehand.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <span>
#include <string>

#include "standalone/archive/recording_part.h"

namespace lookhaven::media {

enum class Container { kMatroska, kMp4 };

// Takes bytes; false, with errno set, when it cannot.
using ByteSink = std::function<bool(std::span<const std::uint8_t>)>;

// MP4 where players expect it, Matroska for all else.
Container ContainerFor(const archive::IndexHeader& format, bool with_sound);

// The most bytes that the part takes of a file. What is left is filled with elements that hold nothing.
std::int64_t MaxJoinedBytes(const archive::RecordingPart& part, Container container);

struct JoinOptions {
    Container container = Container::kMatroska;
    bool with_sound = true;
    std::int64_t size_bytes = 0;  // of the whole file: the sum of MaxJoinedBytes
    // A part that cannot be opened, or not read to its end, is left out from there on: called with why and with the
    // moment, by the wall clock, from which on it is missing. What it throws ends the join. Empty: SourceError instead.
    std::function<void(const archive::RecordingPart& part, std::int64_t from_wall_ms, const std::string& reason)>
        on_unreadable = {};
};

// What the recording's sound is made of, to be compared: recordings with another cannot be joined. Empty without sound.
// Throws SourceError, std::system_error.
std::string SoundOf(const std::filesystem::path& recording);

// The parts have one format and are in the order of time. A time without recordings stays in the file as one in which
// the picture stands still. Keeps at most a second of footage in memory. False when none of the parts could be read:
// then nothing was sent. Throws SourceError; std::system_error with the sink's errno.
bool Join(std::span<const archive::RecordingPart> parts, const JoinOptions& options, const ByteSink& sink);

}  // namespace lookhaven::media
