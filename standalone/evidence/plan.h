// SPDX-License-Identifier: Apache-2.0
//
// What an export of a span will hold, known to the byte before the first one is sent.
//
// Why so        A user must see whether the download is complete, and how long it will take. So sizes, times and
//               gaps come from the frame indexes, and each file is filled up to its size; only the hashes come later.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "standalone/archive/recording_part.h"
#include "standalone/media/libav_libraries.h"

namespace lookhaven::evidence {

struct CameraFootage {
    int id = 0;
    std::string name = {};
    bool with_sound = true;
    // Absolute, in the order of time; those that are gone are left out.
    std::vector<std::filesystem::path> recordings = {};
};

struct Request {
    std::vector<CameraFootage> cameras = {};
    archive::TimeSpan span = {};
    bool as_archive = false;    // as a ZIP, however few files there are
    std::string exporter = {};  // the account; may be empty
    std::int64_t now_ms = 0;    // wall clock
    int utc_offset_min = 0;     // of local times
    bool names_in_utc = false;  // the times in file names
};

// The recordings of one camera that follow each other in one format, at most ten minutes apart.
struct File {
    std::string name = {};
    media::Container container = media::Container::kMatroska;
    bool with_sound = true;
    std::vector<archive::RecordingPart> parts = {};
    std::int64_t size_bytes = 0;

    bool HasSound() const { return with_sound && !parts.front().header.audio_codec.empty(); }
};

struct Camera {
    int id = 0;
    std::string name = {};
    std::vector<File> files = {};
    std::vector<archive::TimeSpan> gaps = {};  // in the span
};

struct Plan {
    Request request = {};
    std::vector<Camera> cameras = {};
    std::string name = {};  // of the whole: a file name in UTF-8
    const char* content_type = "";
    bool is_archive = false;
    std::int64_t size_bytes = 0;
};

// A recording that is damaged, gone or cannot be read is left out, which shows as a gap and in the log. The plan has no
// camera with a file when nothing was recorded.
Plan MakePlan(Request request, const media::RemuxLibrary& remux);

}  // namespace lookhaven::evidence
