// SPDX-License-Identifier: Apache-2.0
//
// lookhaven export: takes a span of several cameras away as one file.
#include <algorithm>
#include <ctime>
#include <filesystem>
#include <iostream>
#include <map>

#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/io.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/export_checks.h"
#include "standalone/cli/new_file.h"
#include "standalone/cli/units.h"
#include "standalone/evidence/manifest.h"
#include "standalone/evidence/signing_key.h"
#include "standalone/evidence/write.h"
#include "standalone/media/source.h"
#include "standalone/store/cameras.h"
#include "standalone/store/events.h"
#include "standalone/store/mounts.h"

namespace lookhaven::cli {

namespace {

struct Request {
    std::vector<std::string> cameras_and_file;
    std::string from;
    std::string to = "now";
    bool no_sound = false;
};

int CameraId(const std::string& text) {
    const std::optional<int> id = ParseNumber<int>(text);
    if (!id) {
        throw Failure(kUsage, text, " is not a camera's id: see lookhaven export --help");
    }
    return *id;
}

int UtcOffsetAt(std::int64_t moment_s) {
    const auto time = static_cast<std::time_t>(moment_s);
    std::tm local{};
    return ::localtime_r(&time, &local) == nullptr ? 0 : static_cast<int>(local.tm_gmtoff / 60);
}

evidence::Request RequestOf(store::Store& store, const Request& request) {
    const std::int64_t now_s = base::WallSeconds();
    const std::int64_t from_s = ParseMoment(request.from, now_s);
    const std::int64_t to_s = ParseMoment(request.to, now_s);
    if (to_s <= from_s) {
        throw Failure(kUsage, "--to must be after --from");
    }
    std::map<int, std::string> mounts;
    for (const store::Mount& mount : store::Mounts(store).List()) {
        mounts.emplace(mount.id, mount.path);
    }
    evidence::Request wanted{.span = {from_s * 1000, to_s * 1000}, .now_ms = now_s * 1000};
    wanted.as_archive = request.cameras_and_file.back().ends_with(".zip");
    wanted.utc_offset_min = UtcOffsetAt(from_s);
    for (auto id = request.cameras_and_file.begin(); id + 1 != request.cameras_and_file.end(); ++id) {
        evidence::CameraFootage footage{.id = CameraId(*id), .name = "Camera " + *id, .with_sound = !request.no_sound};
        if (const auto camera = store::Cameras(store).Find(footage.id)) {
            footage.name = camera->name;
        }
        for (const store::Event& event :
             store::Events(store).List({.camera_ids = {footage.id}, .begin_s = from_s, .end_s = to_s})) {
            if (const auto mount = mounts.find(event.mount_id); !event.demo && mount != mounts.end()) {
                footage.recordings.push_back(std::filesystem::path(mount->second) / event.path);
            }
        }
        wanted.cameras.push_back(std::move(footage));
    }
    return wanted;
}

evidence::Plan RequirePlan(store::Store& store, const Request& request, const media::RemuxLibrary& remux) {
    evidence::Plan plan = evidence::MakePlan(RequestOf(store, request), remux);
    if (std::ranges::all_of(plan.cameras, [](const auto& camera) { return camera.files.empty(); })) {
        throw Failure(kNoInput, "nothing of these cameras was recorded in that time: see lookhaven event list");
    }
    if (plan.is_archive && !plan.request.as_archive && request.cameras_and_file.back() != "-") {
        throw Failure(kUsage, "this becomes several files: name a file that ends in .zip");
    }
    return plan;
}

void WriteTo(int output, const evidence::Plan& plan, const media::RemuxLibrary& remux,
             const std::filesystem::path& key) {
    try {
        evidence::Write(
            plan, remux, [output](auto bytes) { return base::WriteAll(output, bytes.data(), bytes.size()); },
            [&key](std::string_view manifest) { return evidence::SignBy(key, manifest); });
    } catch (const media::SourceError& error) {
        throw Failure(kDataError, error.what());
    }
}

evidence::Plan WriteFootage(int output, const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const media::RemuxLibrary& remux = media::LoadRemuxLibrary();
    evidence::Plan plan = RequirePlan(store, request, remux);
    const std::filesystem::path key = console.Installation().SigningKeyFile();
    evidence::RequireSigningKey(key);
    WriteTo(output, plan, remux, key);
    return plan;
}

void Export(const Console& console, const Request& request) {
    if (request.cameras_and_file.size() < 2 || request.from.empty()) {
        throw Failure(kUsage, "export needs cameras, --from and a file: see lookhaven export --help");
    }
    const std::string& file = request.cameras_and_file.back();
    if (file == "-") {
        WriteFootage(STDOUT_FILENO, console, request);
        return;
    }
    evidence::Plan plan;
    WriteNewFile(file, [&](int output) { plan = WriteFootage(output, console, request); });
    std::size_t gaps = 0;
    for (const evidence::Camera& camera : plan.cameras) {
        gaps += camera.gaps.size();
    }
    console.Answer(
        Object("file", file, "size_bytes", Json::Int64{plan.size_bytes}, "camera", evidence::CamerasOf(plan)),
        "Exported ", FormatSize(plan.size_bytes), " to ", file,
        gaps == 0 ? "." : Concat("; ", gaps, gaps == 1 ? " gap" : " gaps", " without footage."));
}

}  // namespace

void AddExport(CLI::App& program, const Console& console) {
    auto request = std::make_shared<Request>();
    CLI::App* app = program.add_subcommand("export", "Takes footage of cameras away as one file, without transcoding");
    app->add_option(
           "camera", request->cameras_and_file,
           "The cameras' ids, and last the file to create; as .zip with a signed manifest of times, gaps and hashes; -"
           " for standard output")
        ->type_name("CAMERA... FILE");
    app->add_option("--from", request->from, "Footage from this time on, such as '2026-03-01 08:15' or -2h");
    app->add_option("--to", request->to, "Footage up to this time (default: now)");
    app->add_flag("--no-sound", request->no_sound, "Leave out the audio");
    AddExportChecks(*app, console);
    app->callback([&console, request, app] {
        if (app->get_subcommands().empty()) {
            Export(console, *request);
        }
    });
}

}  // namespace lookhaven::cli
