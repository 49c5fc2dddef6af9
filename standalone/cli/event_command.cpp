// SPDX-License-Identifier: Apache-2.0
//
// lookhaven event: lists, shows, marks and exports what was recorded.
#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <memory>

#include <fcntl.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/cli/camera_options.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/event_text.h"
#include "standalone/cli/units.h"
#include "standalone/media/remux.h"
#include "standalone/media/source.h"
#include "standalone/store/groups.h"
#include "standalone/store/mounts.h"

namespace lookhaven::cli {

namespace {

using store::Event;
using store::Events;
using store::Mark;
using store::MarkKind;
using store::Marks;
using store::MarkState;

const std::map<std::string, int> kKinds = {{"recorded", 0}, {"alert", 1}, {"pos", 2}};
const std::map<std::string, MarkKind> kMarkKinds = {{"alert", MarkKind::kAlert}, {"pos", MarkKind::kPos}};
const std::map<std::string, int> kReasons = {{"continuous", base::kReasonContinuous}, {"alarm", base::kReasonAlarm}};

struct Request {
    int id = 0;
    std::string file;
    bool no_sound = false;
    bool undo = false;
    std::vector<int> cameras;
    int camera = 0;
    int group = 0;
    int mount = 0;
    int kind = 0;
    int reason = 0;
    bool finished = false;
    int limit = 50;
    std::string from;
    std::string to;
    MarkKind mark_kind = MarkKind::kAlert;
    std::string at = "now";
    std::string length = "0";
    std::vector<std::string> text;
};

std::int64_t NowSeconds() {
    return base::WallMillis() / 1000;
}

std::set<int> ChosenCameras(store::Store& store, const Request& request) {
    std::set<int> cameras(request.cameras.begin(), request.cameras.end());
    if (request.group != 0) {
        const auto group = store::Groups(store).Find(request.group);
        if (!group) {
            throw Failure(kNoInput, "there is no camera group " + std::to_string(request.group) +
                                        ": lookhaven group list names them");
        }
        cameras.insert(group->camera_ids.begin(), group->camera_ids.end());
    } else if (request.cameras.empty()) {
        cameras = Events(store).CamerasOn(request.mount);
        for (const store::Camera& camera : store::Cameras(store).List()) {
            cameras.insert(camera.id);
        }
    }
    return cameras;
}

// What event and mark filters have in common.
template <typename Filter>
Filter FilterOf(store::Store& store, const Request& request) {
    const std::int64_t now = NowSeconds();
    Filter filter;
    filter.camera_ids = ChosenCameras(store, request);
    filter.begin_s = request.from.empty() ? 0 : ParseMoment(request.from, now);
    filter.end_s = request.to.empty() ? filter.end_s : ParseMoment(request.to, now);
    filter.newest_first = true;
    filter.limit = request.limit;
    return filter;
}

void ListRecorded(const Console& console, store::Store& store, const Request& request) {
    auto filter = FilterOf<store::EventFilter>(store, request);
    filter.mount_id = request.mount;
    filter.reason = request.reason;
    filter.finished_only = request.finished;
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "camera", "start", "length", "size", "video", "audio", ""}};
    for (const Event& event : Events(store).List(filter)) {
        data.append(ToData(event));
        rows.push_back({std::to_string(event.id), std::to_string(event.camera_id), FormatMoment(event.start_s),
                        FormatDuration(event.end_s - event.start_s), FormatSize(event.size_bytes),
                        VideoTypeName(event.video_type), event.audio_codec,
                        std::string(event.recording ? "recording" : "") + (event.archived ? "archived" : "") +
                            (event.demo ? "demo" : "")});
    }
    console.Answer(rows.size() == 1 ? "There is no such event." : Table(rows), data);
}

void ListMarks(const Console& console, store::Store& store, const Request& request) {
    auto filter = FilterOf<store::MarkFilter>(store, request);
    filter.kind = static_cast<MarkKind>(request.kind);
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "camera", "moment", "state", "text"}};
    for (const Mark& mark : Marks(store).List(filter)) {
        data.append(ToData(mark));
        rows.push_back({std::to_string(mark.id), std::to_string(mark.camera_id), FormatMoment(mark.moment_s),
                        NameOf(mark.state), mark.text.substr(0, mark.text.find('\n'))});
    }
    console.Answer(rows.size() == 1 ? "There is no such event." : Table(rows), data);
}

void List(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    request.kind == 0 ? ListRecorded(console, store, request) : ListMarks(console, store, request);
}

// An event of whatever kind: ids are of one counter.
struct Found {
    std::optional<Event> event;
    std::optional<Mark> mark;
};

Found Require(store::Store& store, int id) {
    Found found{Events(store).Find(id), std::nullopt};
    for (const auto& [name, kind] : kMarkKinds) {
        found.mark = found.event || found.mark ? found.mark : Marks(store).Find(kind, id);
    }
    if (!found.event && !found.mark) {
        throw Failure(kNoInput, "there is no event " + std::to_string(id) + ": lookhaven event list names them");
    }
    return found;
}

// Empty when there is no file.
std::filesystem::path FileOf(store::Store& store, const Found& found) {
    const int mount_id = found.event ? found.event->mount_id : found.mark->mount_id;
    const std::string& path = found.event ? found.event->path : found.mark->path;
    const bool has_file =
        found.event ? !found.event->demo : found.mark->state == MarkState::kSaved && !found.mark->demo;
    const auto mount = store::Mounts(store).Find(mount_id);
    return has_file && mount ? std::filesystem::path(mount->path) / path : std::filesystem::path();
}

void Show(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Found found = Require(store, request.id);
    const std::filesystem::path file = FileOf(store, found);
    const bool exists = !file.empty() && ::access(file.c_str(), R_OK) == 0;
    Json::Value data = found.event ? ToData(*found.event) : ToData(*found.mark);
    data["file"] = file.string();
    data["file_readable"] = exists;
    std::string text = found.event ? Description(*found.event) : Description(*found.mark);
    if (!file.empty()) {
        text += "file   " + file.string() + (exists ? "" : " (cannot be read)") + "\n";
    }
    console.Answer(text, data);
}

void Archive(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    if (!Events(store).SetArchived(request.id, !request.undo)) {
        throw Failure(kNoInput,
                      "there is no recorded event " + std::to_string(request.id) + ": lookhaven event list names them");
    }
    console.Answer("Event " + std::to_string(request.id) +
                       (request.undo ? " is removed in its turn again." : " is kept, whatever its mount's limits are."),
                   ToData(*Events(store).Find(request.id)));
}

void AddMark(const Console& console, const Request& request) {
    const std::int64_t moment = ParseMoment(request.at, NowSeconds());
    std::string text;
    for (const std::string& line : request.text) {
        text += (text.empty() ? "" : "\n") + line;
    }
    store::Store store = console.OpenStore();
    const Mark mark = Marks(store).Add(request.mark_kind, request.camera, moment, ParseDuration(request.length), text);
    console.Answer("The " + std::string(mark.kind == MarkKind::kAlert ? "alert" : "sale") + " has the id " +
                       std::to_string(mark.id) + "; its footage from " + FormatMoment(mark.start_s) + " to " +
                       FormatMoment(mark.end_s) + " follows.",
                   ToData(mark));
}

std::filesystem::path RequireFile(store::Store& store, const Request& request) {
    const Found found = Require(store, request.id);
    const std::string event = "event " + std::to_string(request.id);
    if (found.mark && found.mark->state == MarkState::kPending && !found.mark->demo) {
        throw Failure(kUnavailable, "the footage of " + event + " is not complete yet: try again after its end");
    }
    const std::filesystem::path file = FileOf(store, found);
    if (file.empty()) {
        throw Failure(kNoInput, "there is no footage of " + event);
    }
    return file;
}

void CopyTo(int output, const std::filesystem::path& recording, const media::ExportOptions& options) {
    try {
        media::Export(recording, output, options);
    } catch (const media::SourceError& error) {
        throw Failure(kDataError, error.what());
    }
}

// The file is not there unless it is whole.
void CopyToFile(const std::string& file, const std::filesystem::path& recording, const media::ExportOptions& options) {
    if (::access(file.c_str(), F_OK) == 0) {
        throw Failure(kCannotCreate, "there is already a file " + file + ": name another one");
    }
    const base::FileDescriptor output = base::OpenFile(file, O_RDWR | O_CREAT | O_EXCL, 0600);
    try {
        CopyTo(output.Get(), recording, options);
    } catch (...) {
        std::error_code ignored;
        std::filesystem::remove(file, ignored);
        throw;
    }
}

void Export(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const std::int64_t now = NowSeconds();
    media::ExportOptions options;
    options.with_sound = !request.no_sound;
    if (!request.from.empty()) {
        options.begin_ms = ParseMoment(request.from, now) * 1000;
    }
    if (!request.to.empty()) {
        options.end_ms = ParseMoment(request.to, now) * 1000;
    }
    const std::filesystem::path recording = RequireFile(store, request);
    if (request.file == "-") {
        CopyTo(STDOUT_FILENO, recording, options);
        return;
    }
    CopyToFile(request.file, recording, options);
    Json::Value data;
    data["id"] = request.id;
    data["file"] = request.file;
    data["size_bytes"] = Json::Int64(std::filesystem::file_size(request.file));
    console.Answer("Event " + std::to_string(request.id) + " is copied to " + request.file + ".", data);
}

void AddSpan(CLI::App* command, Request& request, const char* of_what) {
    command->add_option("--from", request.from, std::string(of_what) + " from here, such as '2026-03-01 08:15' or -2h");
    command->add_option("--to", request.to, "… up to here");
}

}  // namespace

void AddEvent(CLI::App& program, Console& console) {
    CLI::App* group = program.add_subcommand("event", "Recorded events, alerts and sales")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    CLI::App* list = command("list", "Lists events, the newest first", List);
    list->add_option("--camera", request->cameras, "Of this camera; may be repeated (else of all)")
        ->allow_extra_args(false);
    list->add_option("--group", request->group, "Of this group's cameras");
    list->add_option("--mount", request->mount, "On this mount");
    AddSpan(list, *request, "Events that touch the time");
    Choose(list->add_option("--kind", request->kind, "Which kind (else recorded)"), kKinds);
    Choose(list->add_option("--reason", request->reason, "Recorded for this reason"), kReasons);
    list->add_flag("--finished", request->finished, "Leave out what is still recording");
    list->add_option("--limit", request->limit, "At most so many (else 50)")->check(CLI::NonNegativeNumber);

    command("show", "Shows an event", Show)->add_option("id", request->id, "The event's id")->required();

    CLI::App* archive = command("archive", "Keeps a recorded event beyond its mount's limits", Archive);
    archive->add_option("id", request->id, "The event's id")->required();
    archive->add_flag("--undo", request->undo, "Keep it no longer than others");

    CLI::App* mark = command("mark", "Reports an alert or a sale, whose footage is kept together", AddMark);
    mark->add_option("camera", request->camera, "The camera's id")->required();
    Choose(mark->add_option("--kind", request->mark_kind, "Which kind (else alert)"), kMarkKinds);
    mark->add_option("--at", request->at, "When it happened (else now)");
    mark->add_option("--length", request->length, "How long it took, such as 30s (else a moment)");
    mark->add_option("--text", request->text, "A line of text; may be repeated")->allow_extra_args(false);

    CLI::App* copy = command("export", "Copies an event to a Matroska file, without coding it anew", Export);
    copy->add_option("id", request->id, "The event's id")->required();
    copy->add_option("file", request->file, "The file to make; - for standard output")->required();
    copy->add_flag("--no-sound", request->no_sound, "Leave out the sound");
    AddSpan(copy, *request, "Only footage");
}

}  // namespace lookhaven::cli
