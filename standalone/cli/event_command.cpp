// SPDX-License-Identifier: Apache-2.0
//
// lookhaven event: lists, shows, keeps, marks, exports and removes what was recorded.
#include <exception>
#include <filesystem>
#include <optional>
#include <set>

#include <unistd.h>

#include "standalone/admin/change.h"
#include "standalone/admin/kept_events.h"
#include "standalone/admin/removed_events.h"
#include "standalone/base/clock.h"
#include "standalone/cli/command_group.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/event_lookup.h"
#include "standalone/cli/event_text.h"
#include "standalone/cli/new_file.h"
#include "standalone/cli/units.h"
#include "standalone/media/remux.h"
#include "standalone/media/source.h"
#include "standalone/store/groups.h"
#include "standalone/store/kept_events.h"
#include "standalone/store/mounts.h"
#include "standalone/store/value_names.h"

namespace lookhaven::cli {

namespace {

using store::Event;
using store::Events;
using store::Mark;
using store::MarkKind;
using store::Marks;

const Names<int> kKinds = {{"recorded", 0}, {"alert", 1}, {"pos", 2}};
const Names<int> kReasons = {{"continuous", base::kReasonContinuous}, {"alarm", base::kReasonAlarm}};

struct Request {
    int id = 0;
    std::vector<int> ids;
    std::string file;
    bool no_sound = false;
    bool footage = false;
    std::string note;
    bool kept = false;
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
    std::string words;
};

std::set<int> ChosenCameras(store::Store& store, const Request& request) {
    std::set<int> cameras(request.cameras.begin(), request.cameras.end());
    if (request.group != 0) {
        const store::CameraGroup group = Require(store::Groups(store).Find(request.group), "there is no camera group ",
                                                 request.group, ": see lookhaven group list");
        cameras.insert(group.camera_ids.begin(), group.camera_ids.end());
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
    const std::int64_t now = base::WallSeconds();
    Filter filter;
    filter.camera_ids = ChosenCameras(store, request);
    filter.begin_s = request.from.empty() ? 0 : ParseMoment(request.from, now);
    filter.end_s = request.to.empty() ? filter.end_s : ParseMoment(request.to, now);
    filter.newest_first = true;
    filter.limit = request.limit;
    return filter;
}

Json::Value FindEvents(store::Store& store, const Request& request) {
    auto filter = FilterOf<store::EventFilter>(store, request);
    filter.mount_id = request.mount;
    filter.reason = request.reason;
    filter.finished_only = request.finished;
    filter.kept_only = request.kept;
    return Array(Events(store).List(filter), [](const Event& event) { return ToData(event); });
}

Json::Value FindMarks(store::Store& store, const Request& request) {
    auto filter = FilterOf<store::MarkFilter>(store, request);
    if (request.kind != 0) {
        filter.kind = static_cast<MarkKind>(request.kind);
    }
    if (!request.words.empty()) {
        filter.words = store::TextQuery(request.words);
    }
    return Array(Marks(store).List(filter), [&](const Mark& mark) { return ToData(mark, filter.words); });
}

void List(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const bool recorded = request.kind == 0 && request.words.empty();
    const Json::Value data = recorded ? FindEvents(store, request) : FindMarks(store, request);
    console.Answer(data, data.empty() ? "There is no such event." : recorded ? EventTable(data) : MarkTable(data));
}

void Show(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const Found found = RequireEvent(store, request.id);
    const std::filesystem::path file = FileOf(store, found);
    const bool exists = !file.empty() && ::access(file.c_str(), R_OK) == 0;
    Json::Value data = found.event ? ToData(*found.event) : ToData(*found.mark);
    data["file"] = file.string();
    data["file_readable"] = exists;
    std::string text = found.event ? Description(*found.event) : Description(*found.mark);
    if (const auto record = store::KeptEvents(store).Find(request.id)) {
        data["note"] = record->note;
        data["kept_by"] = record->keeper;
        data["kept"] = Json::Int64{record->kept_s};
        text += Description(*record);
    }
    if (!file.empty()) {
        text += "file   " + file.string() + (exists ? "" : " (cannot be read)") + "\n";
    }
    console.Answer(data, text);
}

// Applies the change to the recording, or to the recordings that hold the footage of an alert or POS transaction.
void ChangeKeeping(const Console& console, const Request& request, const auto& change, const char* what) {
    store::Store store = console.OpenStore();
    const Found found = RequireEvent(store, request.id);
    std::vector<int> ids;
    for (const Event& event : RecordingsOf(store, found)) {
        ids.push_back(event.id);
    }
    if (change(store, ids) == 0) {
        throw Failure(kNoInput, "there is no footage of event ", request.id);
    }
    console.Answer(Array(ids, [&](int id) { return ToData(*Events(store).Find(id)); }), "Event ", request.id, what);
}

void Keep(const Console& console, const Request& request) {
    const auto keep = [&](store::Store& store, const std::vector<int>& ids) {
        return admin::KeepEvents(store, {}, ids, request.note);
    };
    ChangeKeeping(console, request, keep, " is kept beyond its mount's limits.");
}

void Release(const Console& console, const Request& request) {
    const auto release = [](store::Store& store, const std::vector<int>& ids) {
        return admin::ReleaseEvents(store, {}, ids);
    };
    ChangeKeeping(console, request, release, " is no longer kept.");
}

// Returns how many recordings were removed.
int RemoveOne(store::Store& store, int id, bool with_footage) {
    const Found found = RequireEvent(store, id);
    std::vector<Event> recordings;
    if (found.event || with_footage) {
        recordings = RecordingsOf(store, found);
    }
    admin::RemoveEvents(store, {}, recordings, found.mark);
    return static_cast<int>(recordings.size());
}

// What cannot be removed keeps no other from being removed; a store that fails ends it.
void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Json::Value removed = Json::arrayValue;
    std::string text;
    std::optional<Failure> refusal;
    std::exception_ptr failure;
    const auto refuse = [&](ExitCode code, const char* why) {
        refusal = refusal ? Failure(refusal->Code(), refusal->what(), "; ", why) : Failure(code, why);
    };
    for (auto id = request.ids.begin(); id != request.ids.end() && !failure; ++id) {
        try {
            const int recordings = RemoveOne(store, *id, request.footage);
            removed.append(Object("id", *id, "recordings", recordings));
            text += Concat("Event ", *id, " was removed",
                           recordings == 0 ? ".\n" : "; the recorder deletes its footage from the disk.\n");
        } catch (const Failure& error) {
            refuse(error.Code(), error.what());
        } catch (const admin::StillNeeded& error) {
            refuse(kDataError, error.what());
        } catch (...) {
            failure = std::current_exception();
        }
    }
    if (!removed.empty()) {
        console.Answer(removed, text);
    }
    if (failure) {
        std::rethrow_exception(failure);
    }
    if (refusal) {
        throw *refusal;
    }
}

void AddMark(const Console& console, const Request& request) {
    const std::int64_t moment = ParseMoment(request.at, base::WallSeconds());
    std::string text;
    for (const std::string& line : request.text) {
        text += (text.empty() ? "" : "\n") + line;
    }
    store::Store store = console.OpenStore();
    const Mark mark = Marks(store).Add(request.mark_kind, request.camera, moment, ParseDuration(request.length), text,
                                       {}, base::WallSeconds());
    console.Answer(ToData(mark), "Added ", mark.kind == MarkKind::kAlert ? "alert" : "POS transaction", " with id ",
                   mark.id, "; its footage from ", FormatMoment(mark.start_s), " to ", FormatMoment(mark.end_s),
                   " is saved once it is recorded.");
}

std::filesystem::path RequireFile(store::Store& store, const Request& request) {
    const Found found = RequireEvent(store, request.id);
    if (found.mark && found.mark->state == store::MarkState::kPending && !found.mark->demo) {
        throw Failure(kUnavailable, "the footage of event ", request.id,
                      " is not complete yet: try again after its end");
    }
    const std::filesystem::path file = FileOf(store, found);
    if (file.empty()) {
        throw Failure(kNoInput, "there is no footage of event ", request.id);
    }
    return file;
}

void ExportTo(int output, const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const std::int64_t now = base::WallSeconds();
    media::ExportOptions options;
    options.with_sound = !request.no_sound;
    if (!request.from.empty()) {
        options.begin_ms = ParseMoment(request.from, now) * 1000;
    }
    if (!request.to.empty()) {
        options.end_ms = ParseMoment(request.to, now) * 1000;
    }
    try {
        media::Export(RequireFile(store, request), output, options);
    } catch (const media::SourceError& error) {
        throw Failure(kDataError, error.what());
    }
}

void Export(const Console& console, const Request& request) {
    if (request.file == "-") {
        ExportTo(STDOUT_FILENO, console, request);
        return;
    }
    const Json::Int64 size_bytes = WriteNewFile(request.file, [&](int output) { ExportTo(output, console, request); });
    console.Answer(Object("id", request.id, "file", request.file, "size_bytes", size_bytes), "Event ", request.id,
                   " was exported to ", request.file, ".");
}

}  // namespace

void AddEvent(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "event", "Recorded events, alerts and POS transactions");
    Request& request = group.request();
    const std::string id = "The event's id";
    const auto add_span = [&](Command command, const std::string& what) {
        command.Option("--from", request.from, what + " from this time on, such as '2026-03-01 08:15' or -2h")
            .Option("--to", request.to, what + " up to this time");
    };
    Command list =
        group.Add("list", "Lists events, newest first", List)
            .Option("--camera", request.cameras, "Events of this camera; may be repeated (default: all)", Repeatable)
            .Option("--group", request.group, "Events of the cameras in this group")
            .Option("--mount", request.mount, "Events on this mount")
            .Option("--kind", request.kind, "The kind of events (default: recorded)", OneOf(kKinds))
            .Option("--text", request.words, "Alerts and POS transactions with these words in their text")
            .Option("--reason", request.reason, "Events recorded for this reason", OneOf(kReasons))
            .Flag("--finished", request.finished, "Leave out events that are still being recorded")
            .Flag("--kept", request.kept, "Only recorded events that are kept")
            .Option("--limit", request.limit, "Maximum number of events (default: 50)",
                    Satisfies(CLI::NonNegativeNumber));
    add_span(list, "Events");
    group.Add("show", "Shows an event", Show).Option("id", request.id, id, Required);
    group.Add("keep", "Keeps an event's footage beyond its mount's limits", Keep)
        .Option("id", request.id, id, Required)
        .Option("--note", request.note, "Why it is kept");
    group.Add("release", "Releases a kept event", Release).Option("id", request.id, id, Required);
    group.Add("remove", "Deletes recorded events, or alerts and POS transactions with their text", Remove)
        .Option("id", request.ids, "The events' ids", Required)
        .Flag("--footage", request.footage, "Of alerts and POS transactions: also the recordings of their footage");
    group.Add("mark", "Reports an alert or POS transaction with its footage", AddMark)
        .Option("camera", request.camera, "The camera's id", Required)
        .Option("--kind", request.mark_kind, "What to report (default: alert)", OneOf(store::MarkKindNames()))
        .Option("--at", request.at, "When it happened (default: now)")
        .Option("--length", request.length, "How long it took, such as 30s (default: 0)")
        .Option("--text", request.text, "A line of text; may be repeated", Repeatable);
    Command copy = group.Add("export", "Copies an event to a Matroska file without transcoding", Export)
                       .Option("id", request.id, id, Required)
                       .Option("file", request.file, "The file to create; - for standard output", Required)
                       .Flag("--no-sound", request.no_sound, "Leave out the audio");
    add_span(copy, "Footage");
}

}  // namespace lookhaven::cli
