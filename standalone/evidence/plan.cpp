// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/plan.h"

#include <algorithm>
#include <numeric>
#include <set>
#include <stdexcept>
#include <utility>

#include "standalone/base/log.h"
#include "standalone/evidence/manifest.h"
#include "standalone/evidence/signature_library.h"
#include "standalone/evidence/zip_writer.h"
#include "standalone/media/source.h"

namespace lookhaven::evidence {

namespace {

using archive::RecordingPart;
using archive::TimeSpan;

// So long a picture stands still in a file where nothing was recorded. An MP4 could not hold a gap of a day.
constexpr std::int64_t kMaxStillMs = 600'000;

// "2026-03-01 09.15.30", with a Z in UTC.
std::string NameOfTime(const Request& request, std::int64_t wall_ms) {
    std::string time = LocalTime(wall_ms, request.names_in_utc ? 0 : request.utc_offset_min).substr(0, 19);
    time[10] = ' ';
    std::ranges::replace(time, ':', '.');
    return time + (request.names_in_utc ? "Z" : "");
}

// What file systems refuse becomes "_".
std::string FileName(std::string name) {
    std::ranges::replace_if(
        name,
        [](unsigned char c) { return c < ' ' || std::string_view("/\\:*?\"<>|").find(char(c)) != std::string::npos; },
        '_');
    return name;
}

// What must be the same for recordings to be joined.
std::string FormatOf(const CameraFootage& camera, const RecordingPart& part, const media::RemuxLibrary& remux) {
    const archive::IndexHeader& header = part.header;
    const bool has_sound = camera.with_sound && !header.audio_codec.empty();
    return header.codec + ' ' + std::to_string(header.width) + ' ' + std::to_string(header.height) + ' ' +
           (has_sound ? remux.SoundOf(part.path) : "");
}

struct Part {
    RecordingPart recorded;
    std::string format;

    std::int64_t FirstWallMs() const { return recorded.FirstWallMs(); }
};

std::vector<Part> PartsOf(const CameraFootage& camera, const TimeSpan& span, const media::RemuxLibrary& remux) {
    std::vector<Part> parts;
    for (const std::filesystem::path& recording : camera.recordings) {
        // archive::ArchiveError, media::SourceError and std::system_error all name the recording.
        try {
            if (!std::filesystem::exists(recording)) {
                continue;  // deleted meanwhile
            }
            if (auto part = archive::PartOf(recording, span.begin_ms, span.end_ms)) {
                std::string format = FormatOf(camera, *part, remux);
                parts.push_back({*std::move(part), std::move(format)});
            }
        } catch (const std::runtime_error& error) {
            base::LogWarning("left out of an export: " + std::string(error.what()));
        }
    }
    std::ranges::stable_sort(parts, {}, &Part::FirstWallMs);
    return parts;
}

std::vector<File> FilesOf(const CameraFootage& camera, std::vector<Part>&& parts) {
    std::vector<File> files;
    std::string format;
    for (auto& [part, next] : parts) {
        const bool is_apart =
            !files.empty() && part.FirstWallMs() - files.back().parts.back().LastWallMs() > kMaxStillMs;
        if (files.empty() || next != format || is_apart) {
            files.push_back(
                {.container = media::ContainerFor(part.header, camera.with_sound), .with_sound = camera.with_sound});
            format = next;
        }
        files.back().size_bytes += media::MaxJoinedBytes(part, files.back().container);
        files.back().parts.push_back(std::move(part));
    }
    return files;
}

std::vector<TimeSpan> GapsOf(const std::vector<Part>& parts, TimeSpan span) {
    std::vector<TimeSpan> gaps;
    const auto add = [&](std::int64_t begin_ms, std::int64_t end_ms) {
        begin_ms = std::max(begin_ms, span.begin_ms);
        end_ms = std::min(end_ms, span.end_ms);
        if (end_ms - begin_ms > archive::kMinGapMs) {
            gaps.push_back({begin_ms, end_ms});
        }
    };
    std::int64_t reached_ms = span.begin_ms;
    for (const auto& [part, format] : parts) {
        add(reached_ms, part.FirstWallMs());
        for (const TimeSpan& gap : part.gaps) {
            add(gap.begin_ms, gap.end_ms);
        }
        reached_ms = std::max(reached_ms, part.LastWallMs());
    }
    add(reached_ms, span.end_ms);
    return gaps;
}

void NameFiles(Plan& plan) {
    std::set<std::string> names;
    for (Camera& camera : plan.cameras) {
        for (File& file : camera.files) {
            const std::string title =
                FileName(camera.name + ' ' + NameOfTime(plan.request, file.parts.front().FirstWallMs()));
            const std::string extension = file.container == media::Container::kMp4 ? ".mp4" : ".mkv";
            file.name = title + extension;
            for (int count = 2; !names.insert(file.name).second; ++count) {
                file.name = title + " (" + std::to_string(count) + ")" + extension;
            }
        }
    }
}

// As Write sends it, without the files' bytes.
std::int64_t SizeOfArchive(const Plan& plan) {
    ZipWriter zip([](auto) { return true; });
    for (const Camera& camera : plan.cameras) {
        for (const File& file : camera.files) {
            zip.Skip(file.name, file.size_bytes);
        }
    }
    zip.Skip(kManifestName, ManifestBytes(plan));
    zip.Skip(kSignatureName, kSignatureBytes);
    zip.Skip(kPublicKeyName, kPublicKeyBytes);
    zip.End();
    return zip.Position();
}

const File* OnlyFile(const Plan& plan) {
    const File* only = nullptr;
    for (const Camera& camera : plan.cameras) {
        for (const File& file : camera.files) {
            if (only != nullptr) {
                return nullptr;
            }
            only = &file;
        }
    }
    return only;
}

}  // namespace

Plan MakePlan(Request request, const media::RemuxLibrary& remux) {
    Plan plan{.request = std::move(request)};
    const TimeSpan span{plan.request.span.begin_ms, std::min(plan.request.span.end_ms, plan.request.now_ms)};
    for (const CameraFootage& footage : plan.request.cameras) {
        std::vector<Part> parts = PartsOf(footage, span, remux);
        Camera camera{.id = footage.id, .name = footage.name, .files = {}, .gaps = GapsOf(parts, span)};
        camera.files = FilesOf(footage, std::move(parts));
        plan.cameras.push_back(std::move(camera));
    }
    NameFiles(plan);
    const File* only = plan.request.as_archive || plan.cameras.size() > 1 ? nullptr : OnlyFile(plan);
    plan.is_archive = only == nullptr;
    plan.name = only != nullptr ? only->name : "Export " + NameOfTime(plan.request, span.begin_ms) + ".zip";
    plan.content_type = only == nullptr                             ? "application/zip"
                        : only->container == media::Container::kMp4 ? "video/mp4"
                                                                    : "video/x-matroska";
    plan.size_bytes = only != nullptr ? only->size_bytes : SizeOfArchive(plan);
    return plan;
}

}  // namespace lookhaven::evidence
